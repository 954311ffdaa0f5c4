// The limits of doc/protocol.md, read from its table: what is just within one and what is beyond
// it.
#include <sys/socket.h>
#include <unistd.h>

#include <cstddef>
#include <string>
#include <vector>

#include "host/framing.h"
#include "tests/support/protocol_doc.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

class SearchdLimits : public SearchdTest {
 protected:
  std::size_t Limit(const std::string& what) const { return doc_.limits.at(what); }

  // That `request` succeeds, or is answered with 603 and a message that holds `named`.
  void ExpectTaken(const Json::Value& request) const {
    const Json::Value reply = Ask(request);
    EXPECT_EQ(CodeOf(reply), 0) << reply;
  }
  void ExpectRejected(const Json::Value& request, const std::string& named) const {
    const Json::Value reply = Ask(request);
    EXPECT_EQ(CodeOf(reply), 603) << reply;
    EXPECT_NE(MessageOf(reply).find(named), std::string::npos) << reply;
  }

  const ProtocolDoc doc_ = ReadProtocolDoc(PROTOCOL_DOC_PATH);
};

// A path of so many bytes, in parts that a file system takes.
std::string PathOf(std::size_t bytes) {
  std::string path = "/var/packages";
  while (bytes - path.size() > 200) path += "/" + std::string(100, 'p');
  return path + "/" + std::string(bytes - path.size() - 1, 'q');
}

TEST_F(SearchdLimits, OfAFrame) {
  Start();
  std::string request = R"({"command":"index_list"})";
  request.resize(Limit("frame"), ' ');
  EXPECT_EQ(CodeOf(FromText(AskText(request))), 0);

  const Fd fd = Connect(Socket());
  const std::string header = host::FrameHeader(Limit("frame") + 1);
  ASSERT_EQ(write(fd.Get(), header.data(), header.size()), 4);
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(fd.Get(), reply));
  EXPECT_EQ(CodeOf(FromText(reply)), 603);
  EXPECT_NE(reply.find(std::to_string(Limit("frame"))), std::string::npos) << reply;
  EXPECT_EQ(ReadToEnd(fd.Get()), "") << "closed";
}

TEST_F(SearchdLimits, OfClients) {
  Start();
  std::vector<Fd> idle;
  for (std::size_t i = 1; i < Limit("clients delivering a request or taking a reply"); ++i) {
    idle.push_back(Connect(Socket()));
  }
  Fill("enu");  // as the last one there may be
  idle.push_back(Connect(Socket()));
  const Fd next = Connect(Socket());
  ASSERT_TRUE(host::SendFrame(next.Get(), R"({"command":"index_list"})"));
  char byte = 0;
  EXPECT_EQ(recv(next.Get(), &byte, 1, MSG_DONTWAIT), -1);
  idle[7].Close();
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(next.Get(), reply));
  EXPECT_EQ(CodeOf(FromText(reply)), 0);
}

TEST_F(SearchdLimits, OfLevelsOfJson) {
  Start();
  const auto request = [](std::size_t levels) {
    const std::size_t arrays = levels - 2;  // in two objects
    return R"({"command":"index_list","data":{"deep":)" + std::string(arrays, '[') +
           std::string(arrays, ']') + "}}";
  };
  EXPECT_EQ(CodeOf(FromText(AskText(request(Limit("levels of JSON"))))), 0);
  for (const std::size_t levels : {Limit("levels of JSON") + 1, std::size_t{1000000}}) {
    const Json::Value reply = FromText(AskText(request(levels)));
    EXPECT_EQ(CodeOf(reply), 603);
    EXPECT_NE(MessageOf(reply).find("JSON"), std::string::npos) << reply;
  }
}

TEST_F(SearchdLimits, OfIndexes) {
  Start();
  const auto create = [](std::size_t i) {
    const std::string id = std::to_string(i);
    return CreateRequest(id, "/var/packages/" + id);
  };
  for (std::size_t i = 0; i < Limit("indexes"); ++i) ExpectTaken(create(i));
  ExpectRejected(create(Limit("indexes")), std::to_string(Limit("indexes")) + " indexes");
  ExpectTaken(IdRequest("index_delete", "7"));
  ExpectTaken(create(Limit("indexes")));
  ExpectTaken(IdRequest("commit", "8"));
  Restart(SIGTERM);
  EXPECT_EQ(Ask(IdRequest("index_list", ""))["indexes"].size(), Limit("indexes"));
}

TEST_F(SearchdLimits, OfIdsAndPaths) {
  Start();
  const std::string id(Limit("index id"), 'i');
  ExpectTaken(CreateRequest(id, "/var/packages/one"));
  ExpectRejected(CreateRequest(id + "i", "/var/packages/two"), "\"id\"");
  ExpectRejected(CreateRequest("", "/var/packages/two"), "\"id\"");
  ExpectTaken(CreateRequest("longest", PathOf(Limit("path"))));
  ExpectTaken(UpsertRequest("longest", Document("a", "Apple")));
  ExpectTaken(IdRequest("commit", "longest"));
  EXPECT_EQ(Ask(SearchRequest("longest", "apple"))["total"].asInt(), 1);
  ExpectRejected(CreateRequest("longer", PathOf(Limit("path") + 1)), "\"path\"");
  ExpectRejected(CreateRequest("part", "/var/packages/" + std::string(256, 'p')), "\"path\"");
}

TEST_F(SearchdLimits, OfDocuments) {
  Start();
  Create("enu");
  const std::string key(Limit("document key") - 1, 'k');
  Upsert("enu", Document(key + "1", "One"));
  Upsert("enu", Document(key + "2", "Two"));
  ExpectRejected(UpsertRequest("appindex_enu", Document(key + "12", "Three")), "\"doc_id\"");
  Commit("enu");
  EXPECT_EQ(Find("enu", "one"), key + "1");
  EXPECT_EQ(CodeOf(Ask(RemovalRequest("appindex_enu", key + "1"))), 0);
  Commit("enu");
  EXPECT_EQ(Find("enu", "one"), "");
  EXPECT_EQ(Find("enu", "two"), key + "2");

  const std::string text(Limit("text of a member"), 'x');
  Upsert("enu", Document("large", "Large", text));
  ExpectRejected(UpsertRequest("appindex_enu", Document("larger", "L", text + "x")), "\"desc\"");

  Json::Value wide = Document("wide", "Wide");
  while (wide.size() < Limit("members of a document, properties of mappings")) {
    wide["member" + std::to_string(wide.size())] = "x";
  }
  Upsert("enu", wide);
  wide["one more"] = "x";
  ExpectRejected(UpsertRequest("appindex_enu", wide), "members");
  Commit("enu");
  EXPECT_EQ(Find("enu", "large"), "large");
  EXPECT_EQ(Find("enu", "wide"), "wide");
}

TEST_F(SearchdLimits, OfProperties) {
  Start();
  Json::Value mappings = FromText(R"({"property_id":"id"})");
  for (std::size_t i = 0; i < Limit("members of a document, properties of mappings"); ++i) {
    mappings["properties"]["member" + std::to_string(i)] = Json::Value(Json::objectValue);
  }
  ExpectTaken(CreateRequest("a", "/var/packages/a", mappings));
  mappings["properties"]["one more"] = Json::Value(Json::objectValue);
  ExpectRejected(CreateRequest("b", "/var/packages/b", mappings), "mappings.properties");
}

TEST_F(SearchdLimits, OfHits) {
  Start();
  Fill("enu");
  Json::Value request = SearchRequest("appindex_enu", "file");
  request["data"]["limit"] = Json::UInt64{Limit("hits in a reply")};
  ExpectTaken(request);
  request["data"]["limit"] = Json::UInt64{Limit("hits in a reply") + 1};
  ExpectRejected(request, "\"limit\"");
}

TEST_F(SearchdLimits, OfAReply) {
  Start();
  FillWithLargeDocuments("large", 20, Limit("text of a member"));
  Json::Value request = SearchRequest("large", "large");
  ExpectRejected(request, "too long");
  request["data"]["limit"] = 10;
  ExpectTaken(request);
}

TEST_F(SearchdLimits, AreNotSetToWords) {
  Start();
  Create("enu");
  const std::string word(100000, 'w');
  Upsert("enu", Document("long", "Apple " + word, word, word));
  std::string thai;
  for (int i = 0; i < 20000; ++i) thai += "ก";
  Upsert("enu", Document("thai", "Banana " + thai, thai, thai));
  Commit("enu");
  EXPECT_EQ(Find("enu", "apple"), "long");
  EXPECT_EQ(Find("enu", "banana"), "thai");
}

TEST_F(SearchdLimits, KeepTextThatIsNotUtf8Out) {
  Start();
  Fill("enu");
  for (const std::string& text :
       {std::string("\xff"), std::string("\xc0\x80"), std::string("\xed\xa0\x80"),
        std::string("\xf4\x90\x80\x80"), std::string("\xc3"), std::string(1, '\0'),
        std::string("\\u0000"), std::string("\\ud800"), std::string("\\udc00\\ud800")}) {
    for (const std::string& request :
         {R"({"command":"search","data":{"id":"appindex_enu","query":")" + text + R"("}})",
          R"({"command":"search","data":{"id":"appindex_enu","query":"a",")" + text + R"(":1}})",
          R"({"command":"document_upsert_by_id","data":{"id":"appindex_enu","doc_id":"a",)"
          R"("data":{"id":"a","title":")" +
              text + R"("}}})"}) {
      const Json::Value reply = FromText(AskText(request));
      EXPECT_EQ(CodeOf(reply), 603) << request;
    }
  }
  EXPECT_EQ(Find("enu", "file"), "files");
}

}  // namespace
}  // namespace test

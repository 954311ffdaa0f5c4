// Who may ask the search daemon for what, and clients that are slow, many or broken.
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "host/framing.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

constexpr uid_t kStranger = 4711;
constexpr uid_t kVelkor = 4712;

class SearchdClients : public SearchdTest {};

TEST_F(SearchdClients, LetsOthersSearchOnly) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root, to be other users";
  WriteFileOf(root_ / "etc/passwd", "Velkor:x:4712:4712::/:/bin/false\n");
  Start();
  Fill("enu");
  struct stat status {};
  ASSERT_EQ(stat(Socket().c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0666U);

  EXPECT_EQ(AskAs(kStranger, SearchRequest("appindex_enu", "file"))["total"].asInt(), 1);
  EXPECT_EQ(AskAs(kStranger, IdRequest("index_list", ""))["indexes"].size(), 1U);
  for (const Json::Value& request :
       {CreateRequest("appindex_ger", std::string(kIndexes) + "ger"),
        IdRequest("index_delete", "appindex_enu"),
        UpsertRequest("appindex_enu", Document("a", "A")),
        IdRequest("document_del_by_id", "appindex_enu"), IdRequest("commit", "appindex_enu")}) {
    EXPECT_EQ(CodeOf(AskAs(kStranger, request)), 606) << request;
  }
  EXPECT_EQ(CodeOf(AskAs(kVelkor, UpsertRequest("appindex_enu", Document("a", "Apple")))), 0);
  EXPECT_EQ(CodeOf(AskAs(kVelkor, IdRequest("commit", "appindex_enu"))), 0);
  EXPECT_EQ(Find("enu", "apple"), "a");
}

TEST_F(SearchdClients, ServesOthersWhileAClientIsSlow) {
  Start({"--time-limit", "1"});
  const Fd slow = Connect(Socket());
  ASSERT_EQ(write(slow.Get(), "\0\0", 2), 2);
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(ReadToEnd(slow.Get()), "");  // dropped when its time is over
}

TEST_F(SearchdClients, ServesOthersWhileAClientDoesNotTakeItsReply) {
  Start();
  FillWithLargeDocuments("large", 20, 500000);
  std::vector<Fd> idle;
  for (int i = 0; i < 10; ++i) {  // more than the daemon has threads
    idle.push_back(Connect(Socket()));
    ASSERT_TRUE(host::SendFrame(idle.back().Get(), ToText(SearchRequest("large", "large"))));
  }
  EXPECT_EQ(Ask(SearchRequest("large", "large"))["total"].asInt(), 20);
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(idle[3].Get(), reply));
  EXPECT_EQ(FromText(reply)["total"].asInt(), 20);
}

TEST_F(SearchdClients, ForgetsTornRequests) {
  Start();
  {
    const Fd fd = Connect(Socket());
    ASSERT_EQ(write(fd.Get(), "\0\0\0\x09{\"comm", 10), 10);
    ASSERT_EQ(shutdown(fd.Get(), SHUT_WR), 0);
    EXPECT_EQ(ReadToEnd(fd.Get()), "");
  }
  {
    const Fd fd = Connect(Socket());  // gone before the reply
    ASSERT_TRUE(host::SendFrame(fd.Get(), R"({"command":"index_list"})"));
  }
  Fill("enu");
}

}  // namespace
}  // namespace test

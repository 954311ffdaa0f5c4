// The search daemon as a process: its commands, its files, and what it does when things go wrong.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <json/json.h>
#include <sys/file.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "host/framing.h"

namespace {

namespace fs = std::filesystem;

constexpr const char* kIndexes = "/var/packages/Velkor/etc/appindex.db/";
constexpr uid_t kStranger = 4711;
constexpr uid_t kVelkor = 4712;

std::string ReadFile(const fs::path& path) {
  std::ifstream in(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void WriteFile(const fs::path& path, const std::string& text) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out << text;
  ASSERT_TRUE(out.flush()) << path;
}

Json::Value FromText(const std::string& text) {
  Json::Value value;
  std::istringstream in(text);
  in >> value;
  return value;
}

std::string ToText(const Json::Value& value) {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  return Json::writeString(builder, value);
}

// A file descriptor that is closed with its owner.
class Fd {
 public:
  explicit Fd(int fd) : fd_(fd) {}
  Fd(Fd&& other) noexcept : fd_(other.fd_) { other.fd_ = -1; }
  Fd& operator=(Fd&& other) = delete;
  ~Fd() { Close(); }
  int Get() const { return fd_; }
  void Close() {
    if (fd_ >= 0) close(fd_);
    fd_ = -1;
  }

 private:
  int fd_;
};

std::string ReadToEnd(int fd) {
  std::string text;
  std::array<char, 4096> part{};
  ssize_t n = 0;
  while ((n = read(fd, part.data(), part.size())) > 0)
    text.append(part.data(), static_cast<std::size_t>(n));
  return text;
}

sockaddr_un Address(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  std::strncpy(address.sun_path, path.c_str(), sizeof(address.sun_path) - 1);
  return address;
}

Fd Connect(const std::string& path) {
  Fd fd(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = Address(path);
  if (connect(fd.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)) != 0)
    fd.Close();
  return fd;
}

// One run of the program.
class Process {
 public:
  struct Result {
    int status;  // exit status, or 128 and the signal
    std::string error_text;
  };

  Process(std::vector<std::string> arguments, bool wait_until_ready) {
    std::array<int, 2> ready{};
    std::array<int, 2> errors{};
    if (pipe2(ready.data(), O_CLOEXEC) != 0 || pipe2(errors.data(), O_CLOEXEC) != 0) abort();
    if (wait_until_ready) {
      arguments.insert(arguments.end(), {"--ready-fd", std::to_string(ready[1])});
    }
    std::vector<char*> argv{const_cast<char*>(TOVOELASTICD_PATH)};
    for (std::string& argument : arguments) argv.push_back(argument.data());
    argv.push_back(nullptr);
    pid_ = fork();
    if (pid_ == 0) {
      fcntl(ready[1], F_SETFD, 0);
      dup2(errors[1], STDERR_FILENO);
      execv(TOVOELASTICD_PATH, argv.data());
      _exit(127);
    }
    close(ready[1]);
    close(errors[1]);
    errors_ = std::make_unique<Fd>(errors[0]);
    const Fd ready_end(ready[0]);
    if (wait_until_ready) ready_ = ReadToEnd(ready_end.Get()) == "ready\n";
  }
  ~Process() {
    if (pid_ > 0) Stop(SIGKILL);
  }

  bool IsReady() const { return ready_; }
  pid_t Pid() const { return pid_; }

  Result Wait() {
    std::string text = ReadToEnd(errors_->Get());
    int status = 0;
    while (waitpid(pid_, &status, 0) < 0 && errno == EINTR) {
    }
    pid_ = -1;
    return {WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status), text};
  }

  Result Stop(int signal) {
    kill(pid_, signal);
    return Wait();
  }

 private:
  pid_t pid_ = -1;
  std::unique_ptr<Fd> errors_;
  bool ready_ = false;
};

Json::Value Mappings() {
  return FromText(R"({
    "property_id": "id",
    "default": {"type": "string", "analyzer": "tovostandard", "required": false, "stored": true,
                "_all": true},
    "properties": {
      "id": {"analyzer": "keyword", "required": true, "_all": false},
      "owner": {"analyzer": "keyword", "_all": false},
      "title": {"type": "text"}, "desc": {"type": "text"}, "keywords": {"type": "text"},
      "search_title": {"type": "text", "analyzer": "white space",
                       "preprocess": ["tolower", "ngram"]}}})");
}

Json::Value Request(const std::string& command, const Json::Value& data) {
  Json::Value request(Json::objectValue);
  request["command"] = command;
  request["data"] = data;
  return request;
}

Json::Value CreateRequest(const std::string& id, const std::string& path,
                          const Json::Value& mappings = Mappings()) {
  Json::Value data(Json::objectValue);
  data["id"] = id;
  data["path"] = path;
  data["settings"] = Json::Value(Json::objectValue);
  data["mappings"] = mappings;
  return Request("index_create", data);
}

Json::Value UpsertRequest(const std::string& index, const Json::Value& document) {
  Json::Value data(Json::objectValue);
  data["id"] = index;
  data["doc_id"] = document["id"];
  data["data"] = document;
  return Request("document_upsert_by_id", data);
}

Json::Value Document(const std::string& id, const std::string& title, const std::string& desc = "",
                     const std::string& keywords = "", const std::string& owner = "") {
  Json::Value document(Json::objectValue);
  document["id"] = id;
  document["owner"] = owner;
  document["title"] = title;
  document["desc"] = desc;
  document["keywords"] = keywords;
  document["search_title"] = title;
  return document;
}

Json::Value IdRequest(const std::string& command, const std::string& id) {
  Json::Value data(Json::objectValue);
  data["id"] = id;
  return Request(command, data);
}

Json::Value SearchRequest(const std::string& index, const std::string& query) {
  Json::Value request = IdRequest("search", index);
  request["data"]["query"] = query;
  return request;
}

int CodeOf(const Json::Value& reply) {
  return reply["success"].asBool() ? 0 : reply["error"]["code"].asInt();
}

class SearchdTest : public testing::Test {
 protected:
  void SetUp() override {
    std::string name = "/tmp/searchd.XXXXXX";
    ASSERT_NE(mkdtemp(name.data()), nullptr);
    root_ = name;
    // Other users look for the socket in it.
    fs::permissions(root_, static_cast<fs::perms>(0755));
    fs::create_directories(root_ / "var/packages");
    fs::create_directories(root_ / "etc");
  }
  void TearDown() override {
    daemon_.reset();
    fs::remove_all(root_);
  }

  std::string Socket() const { return root_ / "var/run/tovoelasticd.sock"; }
  fs::path Outside(const std::string& path) const { return root_ / path.substr(1); }

  std::unique_ptr<Process> Launch(std::vector<std::string> more = {}) const {
    std::vector<std::string> arguments{"--foreground", "--root", root_};
    arguments.insert(arguments.end(), more.begin(), more.end());
    return std::make_unique<Process>(arguments, true);
  }
  void Start(const std::vector<std::string>& more = {}) {
    daemon_ = Launch(more);
    if (!daemon_->IsReady()) FAIL() << daemon_->Wait().error_text;
  }
  void Restart(int signal) {
    daemon_->Stop(signal);
    Start();
  }

  std::string AskText(const std::string& text) const {
    const Fd fd = Connect(Socket());
    std::string reply;
    if (!host::SendFrame(fd.Get(), text) || !host::RecvFrame(fd.Get(), reply)) return {};
    return reply;
  }
  Json::Value Ask(const Json::Value& request) const { return FromText(AskText(ToText(request))); }

  // The reply to another user's request.
  Json::Value AskAs(uid_t user, const Json::Value& request) const {
    std::array<int, 2> ends{};
    if (pipe(ends.data()) != 0) return {};
    const pid_t child = fork();
    if (child == 0) {
      if (setresgid(user, user, user) != 0 || setresuid(user, user, user) != 0) _exit(1);
      const std::string reply = AskText(ToText(request));
      _exit(write(ends[1], reply.data(), reply.size()) < 0 ? 1 : 0);
    }
    close(ends[1]);
    const Fd end(ends[0]);
    const std::string reply = ReadToEnd(end.Get());
    waitpid(child, nullptr, 0);
    return FromText(reply);
  }

  void Create(const std::string& language) {
    const Json::Value reply = Ask(CreateRequest("appindex_" + language, kIndexes + language));
    ASSERT_EQ(CodeOf(reply), 0) << reply;
  }
  void Upsert(const std::string& language, const Json::Value& document) {
    const Json::Value reply = Ask(UpsertRequest("appindex_" + language, document));
    ASSERT_EQ(CodeOf(reply), 0) << reply;
  }
  void Commit(const std::string& language) {
    const Json::Value reply = Ask(IdRequest("commit", "appindex_" + language));
    ASSERT_EQ(CodeOf(reply), 0) << reply;
  }
  void Fill(const std::string& language) {
    Create(language);
    Upsert(language, Document("files", "File Station", "Manages files"));
    Commit(language);
  }

  // The ids of what a search finds, in its order, or the code of its failure.
  std::string Find(const std::string& language, const std::string& query) const {
    const Json::Value reply = Ask(SearchRequest("appindex_" + language, query));
    if (CodeOf(reply) != 0) return std::to_string(CodeOf(reply));
    std::string ids;
    for (const Json::Value& hit : reply["hits"])
      ids += (ids.empty() ? "" : " ") + hit["id"].asString();
    return ids;
  }

  fs::path root_;
  std::unique_ptr<Process> daemon_;
};

TEST_F(SearchdTest, KeepsDocumentsFromCreationToDeletion) {
  Start();
  Create("enu");
  Upsert("enu", Document("files", "File Station", "Manages files", "folder", ""));
  Upsert("enu", Document("files?share", "Shares", "Shared folders", "file", "files"));
  Commit("enu");

  const Json::Value reply = Ask(SearchRequest("appindex_enu", "file"));
  ASSERT_EQ(reply["total"].asInt(), 2);
  const Json::Value& hit = reply["hits"][0];
  EXPECT_EQ(hit.getMemberNames(),
            (std::vector<std::string>{"desc", "id", "owner", "score", "title"}));
  EXPECT_EQ(hit["id"], "files");
  EXPECT_EQ(hit["title"], "File Station");
  EXPECT_EQ(reply["hits"][1]["owner"], "files");
  EXPECT_GT(hit["score"].asDouble(), reply["hits"][1]["score"].asDouble());

  Upsert("enu", Document("files", "Archive"));
  Json::Value removal = IdRequest("document_del_by_id", "appindex_enu");
  removal["data"]["doc_id"] = "files?share";
  EXPECT_EQ(CodeOf(Ask(removal)), 0);
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "");
  EXPECT_EQ(Find("enu", "archive"), "files");

  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_enu"))), 0);
  EXPECT_EQ(Find("enu", "archive"), "601");
  Fill("ger");  // its commit makes all that is created and deleted durable
  EXPECT_FALSE(fs::exists(Outside(std::string(kIndexes) + "enu")));
}

TEST_F(SearchdTest, ShowsWhatIsCommittedAndNothingElse) {
  Start();
  Create("enu");
  EXPECT_EQ(Find("enu", "file"), "");
  Upsert("enu", Document("files", "File Station"));
  EXPECT_EQ(Find("enu", "file"), "");
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("enu", Document("files", "Archive"));
  EXPECT_EQ(Find("enu", "file"), "files");
  Commit("enu");
  EXPECT_EQ(Find("enu", "file"), "");
}

TEST_F(SearchdTest, ListsIndexes) {
  Start();
  EXPECT_TRUE(Ask(IdRequest("index_list", ""))["indexes"].empty());
  Fill("ger");
  Create("enu");
  const Json::Value list = Ask(FromText(R"({"command":"index_list"})"))["indexes"];
  ASSERT_EQ(list.size(), 2U);
  EXPECT_EQ(list[0]["id"], "appindex_enu");
  EXPECT_EQ(list[0]["documents"].asInt(), 0);
  EXPECT_EQ(list[1]["path"], std::string(kIndexes) + "ger");
  EXPECT_EQ(list[1]["documents"].asInt(), 1);
}

TEST_F(SearchdTest, PagesThroughHits) {
  Start();
  Create("enu");
  for (const char* id : {"a", "b", "c", "d"}) Upsert("enu", Document(id, "Same title"));
  Commit("enu");
  Json::Value request = SearchRequest("appindex_enu", "same");
  request["data"]["offset"] = 1;
  request["data"]["limit"] = 2;
  const Json::Value reply = Ask(request);
  EXPECT_EQ(reply["total"].asInt(), 4);
  ASSERT_EQ(reply["hits"].size(), 2U);
  EXPECT_EQ(reply["hits"][0]["id"], "b");
  EXPECT_EQ(reply["hits"][1]["id"], "c");
}

TEST_F(SearchdTest, RefusesUnknownAndExistingIndexes) {
  Start();
  Fill("enu");
  EXPECT_EQ(CodeOf(Ask(CreateRequest("appindex_enu", std::string(kIndexes) + "other"))), 602);
  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_ger"))), 601);
  EXPECT_EQ(CodeOf(Ask(UpsertRequest("appindex_ger", Document("a", "A")))), 601);
  Json::Value removal = IdRequest("document_del_by_id", "appindex_ger");
  removal["data"]["doc_id"] = "a";
  EXPECT_EQ(CodeOf(Ask(removal)), 601);
  EXPECT_EQ(CodeOf(Ask(IdRequest("commit", "appindex_ger"))), 601);
  EXPECT_EQ(Find("ger", "a"), "601");
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdTest, RejectsMalformedRequests) {
  Start();
  Fill("enu");
  const std::string deep = std::string(101, '[') + std::string(101, ']');
  const std::vector<std::array<std::string, 3>> cases = {
      {"", "603", "JSON"},
      {"{\"command\":\"commit\",}", "603", "JSON"},
      {"{} // comment", "603", "JSON"},
      {"{\"command\":1,\"command\":1}", "603", "JSON"},
      {"{\"a\":" + deep + "}", "603", "JSON"},
      {"[]", "603", "object"},
      {"{}", "603", "\"command\""},
      {"{\"command\":\"commit\"}", "603", "\"id\""},
      {"{\"command\":\"commit\",\"data\":[]}", "603", "\"data\""},
      {"{\"command\":\"commit\",\"data\":{\"id\":7}}", "603", "\"id\""},
      {"{\"command\":\"commit\",\"data\":{\"id\":\"\xff\"}}", "603", "UTF-8"},
      {"{\"command\":\"commit\",\"data\":{\"id\":\"\\u0000\"}}", "603", "\"id\""},
      {"{\"command\":\"destroy\",\"data\":{}}", "604", "destroy"},
      {R"({"command":"search","data":{"id":"appindex_enu"}})", "603", "\"query\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","limit":1001}})", "603",
       "\"limit\""},
      {R"({"command":"search","data":{"id":"appindex_enu","query":"a","offset":-1}})", "603",
       "\"offset\""},
      {R"({"command":"document_upsert_by_id","data":{"id":"appindex_enu","doc_id":"a"}})", "603",
       "\"data\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"b"}}})",
       "603", "\"id\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"title":"x"}}})",
       "603", "\"id\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"a","title":5}}})",
       "603", "\"title\""},
      {R"({"command":"document_upsert_by_id",)"
       R"("data":{"id":"appindex_enu","doc_id":"a","data":{"id":"a","title":"\udc00"}}})",
       "603", ""},
  };
  for (const auto& [text, code, part] : cases) {
    const Json::Value reply = FromText(AskText(text));
    EXPECT_EQ(std::to_string(CodeOf(reply)), code) << text;
    EXPECT_NE(reply["error"]["msg"].asString().find(part), std::string::npos) << text << reply;
  }
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdTest, RejectsOversizedDocuments) {
  Start();
  Create("enu");
  const Json::Value reply =
      Ask(UpsertRequest("appindex_enu", Document("a", "A", std::string(1024 * 1024 + 1, 'x'))));
  EXPECT_EQ(CodeOf(reply), 603);
  EXPECT_NE(reply["error"]["msg"].asString().find("\"desc\""), std::string::npos);
  Upsert("enu", Document("a", "A", std::string(1024 * 1024, 'x')));
  Upsert("enu", Document(std::string(3000, 'i') + "1", "One"));
  Upsert("enu", Document(std::string(3000, 'i') + "2", "Two"));
  Commit("enu");
  EXPECT_EQ(Find("enu", "one"), std::string(3000, 'i') + "1");
  EXPECT_EQ(Ask(IdRequest("index_list", ""))["indexes"][0]["documents"].asInt(), 3);
}

TEST_F(SearchdTest, NamesTheMemberOfMappingsThatIsWrong) {
  Start();
  const std::vector<std::array<std::string, 2>> cases = {
      {R"([])", "mappings"},
      {R"({})", "mappings.property_id"},
      {R"({"property_id":"id","default":{"analyzer":"magic"}})", "mappings.default.analyzer"},
      {R"({"property_id":"id","properties":{"a":{"preprocess":["shout"]}}})",
       "mappings.properties.a.preprocess"},
  };
  for (const auto& [mappings, member] : cases) {
    const Json::Value reply =
        Ask(CreateRequest("appindex_enu", std::string(kIndexes) + "enu", FromText(mappings)));
    EXPECT_EQ(CodeOf(reply), 603) << mappings;
    EXPECT_NE(reply["error"]["msg"].asString().find("\"" + member + "\""), std::string::npos)
        << reply;
  }
  EXPECT_FALSE(fs::exists(Outside(std::string(kIndexes) + "enu")));
}

TEST_F(SearchdTest, ServesAnotherSchema) {
  Start();
  const Json::Value mappings = FromText(R"({
    "property_id": "isbn",
    "properties": {
      "isbn": {"analyzer": "keyword", "required": true},
      "shelf": {"analyzer": "white space", "preprocess": ["tolower"], "required": true},
      "secret": {"stored": false},
      "note": {"_all": false}}})");
  ASSERT_EQ(CodeOf(Ask(CreateRequest("books", "/var/packages/Library/books", mappings))), 0);
  Json::Value upsert = IdRequest("document_upsert_by_id", "books");
  upsert["data"]["doc_id"] = "1-2";
  upsert["data"]["data"] = FromText(
      R"({"isbn":"1-2","shelf":"A-7 Cellar","secret":"gold","note":"hidden","author":"Poe"})");
  ASSERT_EQ(CodeOf(Ask(upsert)), 0);
  ASSERT_EQ(CodeOf(Ask(IdRequest("commit", "books"))), 0);

  for (const char* query : {"1-2", "a-7", "cel", "gold", "poe"}) {
    const Json::Value reply = Ask(SearchRequest("books", query));
    ASSERT_EQ(reply["total"].asInt(), 1) << query;
    EXPECT_EQ(reply["hits"][0]["isbn"], "1-2");
    EXPECT_FALSE(reply["hits"][0].isMember("secret"));
  }
  EXPECT_EQ(Ask(SearchRequest("books", "hidden"))["total"].asInt(), 0);
  EXPECT_EQ(Ask(SearchRequest("books", "7"))["total"].asInt(), 0);

  upsert["data"]["data"].removeMember("shelf");
  EXPECT_EQ(CodeOf(Ask(upsert)), 603);
}

TEST_F(SearchdTest, FindsWordsAndBeginningsInManyLanguages) {
  Start();
  struct Case {
    const char* language;
    const char* title;
    std::vector<std::string> queries;
  };
  const std::vector<Case> cases = {
      {"enu", "BitTorrent Download", {"b", "torrent", "down", "bit down", "ＢＩＴ"}},
      {"ger", "Größenübersicht", {"GRÖSSE", "grossenub", "größ", "übersicht"}},
      {"tha", "ตัวจัดการไฟล์", {"ต", "ตัว", "ตัวจัดก", "ไฟล์", "จัดการ"}},
      {"jpn", "ファイル管理", {"フ", "ファイ", "ふぁいる", "ﾌｧｲﾙ", "管理"}},
      {"chs", "文件管理器", {"文", "文件", "管理", "件管"}},
      {"rus", "Журнал событий", {"ж", "ЖУРНАЛ", "собы"}},
      {"trk", "Işık İstasyonu", {"ışık", "IŞIK", "istasyon", "İSTASYON", "isik"}},
  };
  for (const Case& one : cases) {
    Create(one.language);
    Upsert(one.language, Document("it", one.title));
    Upsert(one.language, Document("other", "Qwxyz"));
    Commit(one.language);
    for (const std::string& query : one.queries) {
      EXPECT_EQ(Find(one.language, query), "it") << one.language << " " << query;
    }
  }
}

TEST_F(SearchdTest, AnswersAnyQuery) {
  Start();
  Fill("enu");
  for (const char* query : {"", " ", "?!", "\t\n", "file zebra"}) EXPECT_EQ(Find("enu", query), "");
  std::string words;
  for (int i = 0; i < 10000; ++i) words += "file ";
  const Json::Value reply = Ask(SearchRequest("appindex_enu", words));
  EXPECT_EQ(reply["total"].asInt(), 1);
  EXPECT_TRUE(reply["cut"].asBool());
  EXPECT_TRUE(Ask(SearchRequest("appindex_enu", std::string(1000000, 'x')))["cut"].asBool());
}

TEST_F(SearchdTest, KeepsIndexesWhereTheyBelong) {
  Start();
  const auto code = [&](const std::string& path) {
    return CodeOf(Ask(CreateRequest("appindex_x", path)));
  };
  EXPECT_EQ(code("/etc/passwd"), 606);
  EXPECT_EQ(code("var/packages/a"), 606);
  EXPECT_EQ(code("/var/packages"), 606);
  EXPECT_EQ(code("/var/packages/"), 603);
  EXPECT_EQ(code("/var/packages/../../etc/x"), 603);
  EXPECT_EQ(code("/var/packages/a//b"), 603);
  EXPECT_EQ(code("/var/packages/" + std::string(2000, 'a')), 603);

  fs::create_directory_symlink("/etc", Outside("/var/packages/link"));
  EXPECT_EQ(code("/var/packages/link/x"), 606);
  EXPECT_EQ(code("/var/packages/link"), 606);
  EXPECT_TRUE(fs::is_empty(root_ / "etc"));

  fs::create_directories(Outside("/var/packages/full"));
  WriteFile(Outside("/var/packages/full/thesis"), "precious");
  EXPECT_EQ(code("/var/packages/full"), 603);
  EXPECT_EQ(ReadFile(Outside("/var/packages/full/thesis")), "precious");

  Create("enu");
  EXPECT_EQ(code(std::string(kIndexes) + "enu"), 603);
  EXPECT_EQ(code(std::string(kIndexes) + "enu/"), 603);
  EXPECT_EQ(code(std::string(kIndexes) + "enu/sub"), 603);
  EXPECT_EQ(code("/var/packages/Velkor"), 603);
  struct stat status {};
  ASSERT_EQ(stat(Outside(std::string(kIndexes) + "enu").c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777U, 0700U);
}

TEST_F(SearchdTest, ClearsWhatAForgottenIndexLeft) {
  Start();
  Fill("enu");
  daemon_->Stop(SIGTERM);
  fs::remove(root_ / "var/lib/tovoelasticd/indexes.json");
  Start();
  EXPECT_EQ(Find("enu", "file"), "601");
  Create("enu");
  EXPECT_EQ(Find("enu", "file"), "");
}

TEST_F(SearchdTest, LetsOthersSearchOnly) {
  if (geteuid() != 0) GTEST_SKIP() << "needs root, to be other users";
  WriteFile(root_ / "etc/passwd", "Velkor:x:4712:4712::/:/bin/false\n");
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

TEST_F(SearchdTest, KnowsItsIndexesAfterARestart) {
  Start();
  Fill("enu");
  Create("ger");
  Restart(SIGTERM);
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(Find("ger", "file"), "");
  Upsert("ger", Document("b", "Datei"));
  Commit("ger");
  EXPECT_EQ(Find("ger", "datei"), "b");
}

TEST_F(SearchdTest, KeepsWhatWasCommittedWhenKilled) {
  Start();
  Fill("enu");
  Restart(SIGKILL);
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdTest, LosesWhatWasNotCommittedWhenKilled) {
  Start();
  Fill("enu");
  Create("ger");
  Commit("enu");  // makes known for good that there is a second index
  // Enough to be applied before a commit asks for it.
  for (int i = 0; i < 100; ++i) {
    Upsert("enu", Document(std::to_string(i), "Lost"));
    Upsert("ger", Document(std::to_string(i), "Lost"));
  }
  Restart(SIGKILL);
  EXPECT_EQ(Find("enu", "lost"), "");
  EXPECT_EQ(Find("ger", "lost"), "");
  EXPECT_EQ(Find("enu", "file"), "files");
  Upsert("ger", Document("b", "Datei"));
  Commit("ger");
  EXPECT_EQ(Find("ger", "datei"), "b");
}

TEST_F(SearchdTest, EndsOrderlyOnSigterm) {
  Start();
  Fill("enu");
  Upsert("enu", Document("a", "Lost"));
  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
  EXPECT_FALSE(fs::exists(Socket()));
  Start();
  EXPECT_EQ(Find("enu", "lost"), "");
  EXPECT_EQ(daemon_->Stop(SIGINT).status, 0);
}

TEST_F(SearchdTest, GoesOnWithoutADamagedIndex) {
  Start();
  Fill("enu");
  Fill("ger");
  Fill("fre");
  Fill("ita");
  daemon_->Stop(SIGTERM);
  WriteFile(Outside(std::string(kIndexes) + "enu/iamglass"), "garbage");
  fs::resize_file(Outside(std::string(kIndexes) + "ita/postlist.glass"), 5000);
  fs::remove(Outside(std::string(kIndexes) + "fre/iamglass"));
  Start();
  for (const std::string language : {"enu", "fre", "ita"}) {
    const Json::Value reply = Ask(SearchRequest("appindex_" + language, "file"));
    EXPECT_EQ(CodeOf(reply), 605);
    EXPECT_NE(reply["error"]["msg"].asString().find(kIndexes + language), std::string::npos)
        << reply;
    Ask(UpsertRequest("appindex_" + language, Document("a", "A")));
    EXPECT_EQ(CodeOf(Ask(IdRequest("commit", "appindex_" + language))), 605);
  }
  EXPECT_EQ(Find("ger", "file"), "files");
  const Json::Value list = Ask(IdRequest("index_list", ""))["indexes"];
  ASSERT_EQ(list.size(), 4U);
  EXPECT_TRUE(list[0]["error"].isString());

  for (const std::string language : {"enu", "fre", "ita"}) {
    EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_" + language))), 0);
    Fill(language);
    EXPECT_EQ(Find(language, "file"), "files");
  }
}

TEST_F(SearchdTest, SetsADamagedRegistryAside) {
  Start();
  Fill("enu");
  daemon_->Stop(SIGTERM);
  WriteFile(root_ / "var/lib/tovoelasticd/indexes.json", "{\"format\":1,");
  Start();
  const Json::Value reply = Ask(SearchRequest("appindex_enu", "file"));
  EXPECT_EQ(CodeOf(reply), 605);
  EXPECT_NE(reply["error"]["msg"].asString().find("indexes.json"), std::string::npos) << reply;
  EXPECT_EQ(ReadFile(root_ / "var/lib/tovoelasticd/indexes.json.damaged"), "{\"format\":1,");
  EXPECT_EQ(CodeOf(Ask(IdRequest("index_delete", "appindex_enu"))), 0);
  EXPECT_EQ(Find("enu", "file"), "601");
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
}

TEST_F(SearchdTest, RunsOncePerRoot) {
  Start();
  const std::unique_ptr<Process> second = Launch();
  EXPECT_FALSE(second->IsReady());
  const Process::Result result = second->Wait();
  EXPECT_EQ(result.status, 3);
  EXPECT_NE(result.error_text.find("another daemon"), std::string::npos) << result.error_text;
  Fill("enu");
}

TEST_F(SearchdTest, ReplacesAStaleSocket) {
  Start();
  daemon_->Stop(SIGKILL);
  EXPECT_TRUE(fs::exists(Socket()));
  Start();
  Fill("enu");
}

TEST_F(SearchdTest, LeavesAForeignFileAlone) {
  fs::create_directories(root_ / "var/run");
  WriteFile(Socket(), "mine");
  const std::unique_ptr<Process> process = Launch();
  EXPECT_FALSE(process->IsReady());
  const Process::Result result = process->Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("not a socket"), std::string::npos) << result.error_text;
  EXPECT_EQ(ReadFile(Socket()), "mine");
}

TEST_F(SearchdTest, LeavesASocketInUseAlone) {
  fs::create_directories(root_ / "var/run");
  const Fd other(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = Address(Socket());
  ASSERT_EQ(bind(other.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  ASSERT_EQ(listen(other.Get(), 1), 0);
  const std::unique_ptr<Process> process = Launch();
  EXPECT_FALSE(process->IsReady());
  EXPECT_EQ(process->Wait().status, 1);
  EXPECT_TRUE(fs::exists(Socket()));
}

TEST_F(SearchdTest, ServesOthersWhileAClientIsSlow) {
  Start({"--time-limit", "1"});
  const Fd slow = Connect(Socket());
  ASSERT_EQ(write(slow.Get(), "\0\0", 2), 2);
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  EXPECT_EQ(ReadToEnd(slow.Get()), "");  // dropped when its time is over
}

TEST_F(SearchdTest, ServesOthersWhileAClientDoesNotTakeItsReply) {
  Start();
  Create("enu");
  for (int i = 0; i < 20; ++i) {
    Upsert("enu", Document(std::to_string(i), "Large", std::string(500000, 'x')));
  }
  Commit("enu");
  std::vector<Fd> idle;
  for (int i = 0; i < 10; ++i) {  // more than the daemon has threads
    idle.push_back(Connect(Socket()));
    ASSERT_TRUE(host::SendFrame(idle.back().Get(), ToText(SearchRequest("appindex_enu", "large"))));
  }
  EXPECT_NE(Find("enu", "large"), "");
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(idle[3].Get(), reply));
  EXPECT_EQ(FromText(reply)["total"].asInt(), 20);
}

TEST_F(SearchdTest, LetsClientsWaitWhenThereAreTooMany) {
  Start();
  std::vector<Fd> idle;
  for (int i = 0; i < 256; ++i) idle.push_back(Connect(Socket()));
  const Fd next = Connect(Socket());
  ASSERT_TRUE(host::SendFrame(next.Get(), R"({"command":"index_list"})"));
  idle[7].Close();
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(next.Get(), reply));
  EXPECT_EQ(CodeOf(FromText(reply)), 0);
}

TEST_F(SearchdTest, RefusesOversizedFramesAndForgetsTornOnes) {
  Start();
  {
    const Fd fd = Connect(Socket());
    ASSERT_EQ(write(fd.Get(), "\x01\0\0\x01", 4), 4);  // one byte more than a frame may have
    std::string reply;
    ASSERT_TRUE(host::RecvFrame(fd.Get(), reply));
    EXPECT_EQ(CodeOf(FromText(reply)), 603);
  }
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

TEST_F(SearchdTest, GoesToTheBackgroundWhenReady) {
  Process start({"--root", root_}, false);
  EXPECT_EQ(start.Wait().status, 0);
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");

  const std::string lock_path = root_ / "var/lib/tovoelasticd/lock";
  const Fd lock(open(lock_path.c_str(), O_RDWR | O_CLOEXEC));
  ASSERT_EQ(kill(std::stoi(ReadFile(lock_path)), SIGTERM), 0);
  EXPECT_EQ(flock(lock.Get(), LOCK_EX), 0);  // waits until the daemon has ended
  EXPECT_FALSE(fs::exists(Socket()));
}

TEST_F(SearchdTest, ReportsAFailedStartInTheBackground) {
  fs::create_directories(root_ / "var/run");
  WriteFile(Socket(), "mine");
  const Process::Result result = Process({"--root", root_}, false).Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("not a socket"), std::string::npos);
}

TEST_F(SearchdTest, ExplainsItsOptions) {
  EXPECT_EQ(Process({"--version"}, false).Wait().status, 0);
  EXPECT_EQ(Process({"--help"}, false).Wait().status, 0);
  for (const std::vector<std::string>& arguments : std::vector<std::vector<std::string>>{
           {"--colour"}, {"--root"}, {"now"}, {"--ready-fd", "x"}}) {
    const Process::Result result = Process(arguments, false).Wait();
    EXPECT_EQ(result.status, 2) << arguments[0];
    EXPECT_NE(result.error_text.find("--help"), std::string::npos);
  }
  const Process::Result result = Process({"--foreground", "--root", root_ / "none"}, false).Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("none"), std::string::npos);
}

}  // namespace

#include "tests/support/searchd_test.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>

#include "host/framing.h"

namespace test {

namespace fs = std::filesystem;

std::string ReadFileOf(const fs::path& path) {
  std::ifstream in(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void WriteFileOf(const fs::path& path, const std::string& text) {
  std::ofstream out(path, std::ios::binary | std::ios::trunc);
  out << text;
  ASSERT_TRUE(out.flush()) << path;
}

void SearchdTest::SetUp() {
  std::string name = "/tmp/searchd.XXXXXX";
  ASSERT_NE(mkdtemp(name.data()), nullptr);
  root_ = name;
  // Other users look for the socket in it.
  fs::permissions(root_, static_cast<fs::perms>(0755));
  fs::create_directories(root_ / "var/packages");
  fs::create_directories(root_ / "etc");
}

void SearchdTest::TearDown() {
  daemon_.reset();
  fs::remove_all(root_);
}

std::unique_ptr<SearchdProcess> SearchdTest::Launch(const std::vector<std::string>& more,
                                                    const std::function<void()>& prepare) const {
  std::vector<std::string> arguments{"--foreground", "--root", root_};
  arguments.insert(arguments.end(), more.begin(), more.end());
  return std::make_unique<SearchdProcess>(arguments, true, prepare);
}

void SearchdTest::Start(const std::vector<std::string>& more) {
  daemon_ = Launch(more);
  if (!daemon_->IsReady()) FAIL() << daemon_->Wait().error_text;
}

void SearchdTest::Restart(int signal) {
  daemon_->Stop(signal);
  Start();
}

bool SearchdTest::MayGoToTheBackground() {
#ifdef __has_feature
#if __has_feature(thread_sanitizer)
  return geteuid() == 0;
#endif
#endif
  return true;
}

void SearchdTest::StopBackground() const {
  const std::string lock_path = root_ / "var/lib/tovoelasticd/lock";
  const Fd lock(open(lock_path.c_str(), O_RDWR | O_CLOEXEC));
  ASSERT_EQ(kill(std::stoi(ReadFileOf(lock_path)), SIGTERM), 0);
  ASSERT_EQ(flock(lock.Get(), LOCK_EX), 0);
}

std::string SearchdTest::AskText(const std::string& text) const {
  const Fd fd = Connect(Socket());
  std::string reply;
  if (!host::SendFrame(fd.Get(), text) || !host::RecvFrame(fd.Get(), reply)) return {};
  return reply;
}

Json::Value SearchdTest::Ask(const Json::Value& request) const {
  return FromText(AskText(ToText(request)));
}

Json::Value SearchdTest::AskAs(uid_t user, const Json::Value& request) const {
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

void SearchdTest::Create(const std::string& language) const {
  const Json::Value reply = Ask(CreateRequest("appindex_" + language, kIndexes + language));
  ASSERT_EQ(CodeOf(reply), 0) << reply;
}

void SearchdTest::Delete(const std::string& language) const {
  const Json::Value reply = Ask(IdRequest("index_delete", "appindex_" + language));
  ASSERT_EQ(CodeOf(reply), 0) << reply;
}

void SearchdTest::Upsert(const std::string& language, const Json::Value& document) const {
  const Json::Value reply = Ask(UpsertRequest("appindex_" + language, document));
  ASSERT_EQ(CodeOf(reply), 0) << reply;
}

void SearchdTest::Commit(const std::string& language) const {
  const Json::Value reply = Ask(IdRequest("commit", "appindex_" + language));
  ASSERT_EQ(CodeOf(reply), 0) << reply;
}

void SearchdTest::Fill(const std::string& language) const {
  Create(language);
  Upsert(language, Document("files", "File Station", "Manages files"));
  Commit(language);
}

void SearchdTest::FillWithLargeDocuments(const std::string& id, int documents,
                                         std::size_t bytes) const {
  const Json::Value mappings =
      FromText(R"({"property_id":"id","properties":{"text":{"analyzer":"keyword","_all":false}}})");
  ASSERT_EQ(CodeOf(Ask(CreateRequest(id, "/var/packages/" + id, mappings))), 0);
  for (int i = 0; i < documents; ++i) {
    Json::Value document(Json::objectValue);
    document["id"] = std::to_string(i);
    document["title"] = "Large";
    document["text"] = std::string(bytes, 'x');
    ASSERT_EQ(CodeOf(Ask(UpsertRequest(id, document))), 0);
  }
  ASSERT_EQ(CodeOf(Ask(IdRequest("commit", id))), 0);
}

std::string SearchdTest::Find(const std::string& language, const std::string& query) const {
  const Json::Value reply = Ask(SearchRequest("appindex_" + language, query));
  if (CodeOf(reply) != 0) return std::to_string(CodeOf(reply));
  std::string ids;
  for (const Json::Value& hit : reply["hits"]) {
    ids += (ids.empty() ? "" : " ") + hit["id"].asString();
  }
  return ids;
}

}  // namespace test

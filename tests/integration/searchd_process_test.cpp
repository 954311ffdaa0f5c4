// The search daemon as a process: its start, its end, its lock and its socket.
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "host/framing.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

namespace fs = std::filesystem;

class SearchdLife : public SearchdTest {};

mode_t ModeOf(const fs::path& path) {
  struct stat status {};
  EXPECT_EQ(lstat(path.c_str(), &status), 0) << path;
  return status.st_mode & 07777U;
}

TEST_F(SearchdLife, EndsOrderlyOnSigterm) {
  Start();
  Fill("enu");
  Upsert("enu", Document("a", "Xylophone"));
  EXPECT_EQ(daemon_->Stop(SIGTERM).status, 0);
  EXPECT_FALSE(fs::exists(Socket()));
  Start();
  EXPECT_EQ(Find("enu", "xylophone"), "");
  EXPECT_EQ(daemon_->Stop(SIGINT).status, 0);
}

TEST_F(SearchdLife, AnswersTheRequestAtHandBeforeItEnds) {
  Start();
  Fill("enu");
  Upsert("enu", Document("a", "Xylophone"));
  // The request is there before the signal; the daemon finds both when it goes on.
  kill(daemon_->Pid(), SIGSTOP);
  const Fd client = Connect(Socket());
  ASSERT_TRUE(host::SendFrame(client.Get(), ToText(IdRequest("commit", "appindex_enu"))));
  kill(daemon_->Pid(), SIGTERM);
  kill(daemon_->Pid(), SIGCONT);
  std::string reply;
  ASSERT_TRUE(host::RecvFrame(client.Get(), reply));
  EXPECT_EQ(CodeOf(FromText(reply)), 0) << reply;
  EXPECT_EQ(daemon_->Wait().status, 0);
  Start();
  EXPECT_EQ(Find("enu", "xylophone"), "a");
}

TEST_F(SearchdLife, MakesItsFilesForWhomTheyAreWhateverTheCallersUmask) {
  fs::remove_all(root_ / "var/packages");
  fs::create_directories(root_ / "var/packages");
  for (const mode_t mask : {0777U, 0U}) {
    fs::remove_all(root_ / "var/run");
    fs::remove_all(root_ / "var/lib");
    daemon_ = Launch({}, [mask] { umask(mask); });
    ASSERT_TRUE(daemon_->IsReady());
    Create("enu");
    Upsert("enu", Document("a", "A"));
    Commit("enu");
    EXPECT_EQ(ModeOf(Socket()), 0666U) << "for everybody";
    EXPECT_EQ(ModeOf(root_ / "var/run"), 0755U);
    EXPECT_EQ(ModeOf(root_ / "var/lib/tovoelasticd"), 0700U) << "for the daemon alone";
    EXPECT_EQ(ModeOf(RegistryFile()), 0600U);
    EXPECT_EQ(ModeOf(IndexFile("enu")), 0700U);
    for (const auto& entry : fs::directory_iterator(IndexFile("enu"))) {
      EXPECT_EQ(ModeOf(entry.path()), 0600U) << entry.path();
    }
    Delete("enu");
    daemon_->Stop(SIGTERM);
  }
}

TEST_F(SearchdLife, RunsOncePerRoot) {
  Start();
  const std::unique_ptr<SearchdProcess> second = Launch();
  EXPECT_FALSE(second->IsReady());
  const SearchdProcess::Result result = second->Wait();
  EXPECT_EQ(result.status, 3);
  EXPECT_NE(result.error_text.find("another daemon"), std::string::npos) << result.error_text;
  Fill("enu");
}

TEST_F(SearchdLife, ReplacesAStaleSocket) {
  Start();
  daemon_->Stop(SIGKILL);
  EXPECT_TRUE(fs::exists(Socket()));
  Start();
  Fill("enu");
}

TEST_F(SearchdLife, ReplacesASocketThatWasNotReadyYet) {
  fs::create_directories(root_ / "var/run");
  {
    // What a daemon leaves that is killed between the steps of its start.
    const Fd unready(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const sockaddr_un address = SocketAddress(Socket() + ".new");
    ASSERT_EQ(bind(unready.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  }
  Start();
  Fill("enu");
  EXPECT_FALSE(fs::exists(Socket() + ".new"));
}

TEST_F(SearchdLife, LeavesAForeignFileAlone) {
  fs::create_directories(root_ / "var/run");
  WriteFileOf(Socket(), "mine");
  const std::unique_ptr<SearchdProcess> process = Launch();
  EXPECT_FALSE(process->IsReady());
  const SearchdProcess::Result result = process->Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("not a socket"), std::string::npos) << result.error_text;
  EXPECT_EQ(ReadFileOf(Socket()), "mine");
}

TEST_F(SearchdLife, LeavesASocketInUseAlone) {
  fs::create_directories(root_ / "var/run");
  const Fd other(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const sockaddr_un address = SocketAddress(Socket());
  ASSERT_EQ(bind(other.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof(address)), 0);
  ASSERT_EQ(listen(other.Get(), 1), 0);
  const std::unique_ptr<SearchdProcess> process = Launch();
  EXPECT_FALSE(process->IsReady());
  EXPECT_EQ(process->Wait().status, 1);
  EXPECT_TRUE(fs::exists(Socket()));
}

TEST_F(SearchdLife, GoesToTheBackgroundWhenReady) {
  if (!MayGoToTheBackground()) GTEST_SKIP() << "needs root with ThreadSanitizer";
  SearchdProcess start({"--root", root_}, false);
  EXPECT_EQ(start.Wait().status, 0);
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
  StopBackground();
  EXPECT_FALSE(fs::exists(Socket()));
}

TEST_F(SearchdLife, ReportsAFailedStartInTheBackground) {
  if (!MayGoToTheBackground()) GTEST_SKIP() << "needs root with ThreadSanitizer";
  fs::create_directories(root_ / "var/run");
  WriteFileOf(Socket(), "mine");
  const SearchdProcess::Result result = SearchdProcess({"--root", root_}, false).Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("not a socket"), std::string::npos);
}

TEST_F(SearchdLife, ExplainsItsOptions) {
  EXPECT_EQ(SearchdProcess({"--version"}, false).Wait().status, 0);
  EXPECT_EQ(SearchdProcess({"--help"}, false).Wait().status, 0);
  for (const std::vector<std::string>& arguments :
       std::vector<std::vector<std::string>>{{"--colour"},
                                             {"--root"},
                                             {"--root", ""},
                                             {"now"},
                                             {"--ready-fd", "x"},
                                             {"--ready-fd", "-1"},
                                             {"--ready-fd", "1000"},
                                             {"--time-limit", "0"},
                                             {"--time-limit", "3601"},
                                             {"--time-limit", "5s"}}) {
    const SearchdProcess::Result result = SearchdProcess(arguments, false).Wait();
    EXPECT_EQ(result.status, 2) << arguments[0];
    EXPECT_NE(result.error_text.find(arguments[0]), std::string::npos) << result.error_text;
    EXPECT_NE(result.error_text.find("--help"), std::string::npos);
  }
  const SearchdProcess::Result result =
      SearchdProcess({"--foreground", "--root", root_ / "none"}, false).Wait();
  EXPECT_EQ(result.status, 1);
  EXPECT_NE(result.error_text.find("none"), std::string::npos);
}

}  // namespace
}  // namespace test

// A daemon that has no more descriptors for its clients.
#include <sys/resource.h>

#include <filesystem>
#include <string>
#include <vector>

#include "tests/support/datagram_socket.h"
#include "tests/support/searchd_test.h"

namespace test {
namespace {

class SearchdDescriptors : public SearchdTest {};

TEST_F(SearchdDescriptors, ThatRunOutMakeClientsWait) {
  std::filesystem::create_directories(root_ / "dev");
  DatagramSocket log(root_ / "dev/log");
  constexpr rlim_t kDescriptors = 64;
  daemon_ = Launch({}, [] {
    const rlimit limit{kDescriptors, kDescriptors};
    setrlimit(RLIMIT_NOFILE, &limit);
  });
  ASSERT_TRUE(daemon_->IsReady());
  std::vector<Fd> idle;
  for (rlim_t i = 0; i < kDescriptors; ++i) idle.push_back(Connect(Socket()));
  const std::string line = log.ReadUntil("cannot accept a client").back();
  EXPECT_EQ(line.rfind("<28>", 0), 0U) << "facility daemon, a warning: " << line;
  EXPECT_NE(line.find("Too many open files"), std::string::npos) << line;
  idle.clear();
  Fill("enu");
  EXPECT_EQ(Find("enu", "file"), "files");
}

}  // namespace
}  // namespace test

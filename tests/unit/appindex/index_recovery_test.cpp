// Recovery from a missing index, on a device client that leaves errno behind.
#include <gmock/gmock.h>

#include <cerrno>
#include <string>

#include "appindex/index_mgr.h"
#include "device/tovodaemon.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"

namespace {

int g_requests = 0;
int g_errno_left = 0;

}  // namespace

// The device's client without a daemon: the first request fails with 601, the others succeed.
namespace tovodaemon {

SockConnection::SockConnection() : fd_(-1) {}
SockConnection::~SockConnection() { errno = g_errno_left; }
void SockConnection::Disconnect() {}
bool SockConnection::Send(const std::string&) { return true; }
bool SockConnection::Recv(std::string& message) {
  message = ++g_requests == 1 ? R"({"success":false,"error":{"code":601,"msg":"none"}})"
                              : R"({"success":true})";
  return true;
}
DomainSockConnection::DomainSockConnection(const std::string& path) : path_(path) {}
bool DomainSockConnection::Connect(long) { return true; }

}  // namespace tovodaemon

namespace velkor::appindex {
namespace {

class IndexRecovery : public test::DeviceRootTest {
 protected:
  // The line of the recovery that a missing index leads to, when the device leaves `left` in errno.
  std::string RecoveryLine(int left) {
    test::WriteFile(test::kSocket, "");
    const std::string conf = test::Install("App");
    g_errno_left = left;
    Add(conf, true);
    const std::vector<std::string> log = TakeLog();
    return log.size() > 2 ? log[2] : "";
  }
};

TEST_F(IndexRecovery, LineIsPlainWhenErrnoIsClear) {
  EXPECT_EQ(RecoveryLine(0),
            test::FailureLine("index_mgr", 245, "Add", "Do reindex to recover missing indices"));
}

TEST_F(IndexRecovery, LineShowsAStaleErrno) {
  EXPECT_EQ(
      RecoveryLine(ENOENT),
      test::FailureLine("index_mgr", 245, "Add",
                        "Do reindex to recover missing indices [err: No such file or directory]"));
}

TEST_F(IndexRecovery, WritesEveryDocumentAnewAfterTheFailedOne) {
  RecoveryLine(0);
  EXPECT_EQ(g_requests, 1 + 21 * 4);  // delete, create, upsert and commit in every language
}

}  // namespace
}  // namespace velkor::appindex

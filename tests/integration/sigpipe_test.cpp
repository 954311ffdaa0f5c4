// A peer that goes away raises no SIGPIPE in the caller's process.
#include <gmock/gmock.h>

#include <csignal>

#include "appindex/index_mgr.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::Reaction;
using test::ScriptedDaemon;

volatile std::sig_atomic_t g_raised = 0;

class LibrarySignals : public test::DeviceRootTest {
 protected:
  LibrarySignals() {
    std::signal(SIGPIPE, [](int) { g_raised = 1; });
    // Larger than a socket takes at once.
    test::WriteFile(ConfOf("App"), R"({"app":"App","title":")" + std::string(4 << 20, 't') + "\"}");
  }
};

TEST_F(LibrarySignals, DaemonThatDoesNotReadIsAFailedSendWithoutASignal) {
  ScriptedDaemon daemon({{Reaction::kRejectSend, ""}});
  const Error error = test::ThrownBy([] { Add(ConfOf("App"), true); });
  EXPECT_EQ(error.code, Error::kElasticdRequestError);
  EXPECT_THAT(error.what(), ::testing::StartsWith("Send failed, req="));
  EXPECT_EQ(g_raised, 0);
}

TEST_F(LibrarySignals, DaemonThatHangsUpIsAFailedReceiveWithoutASignal) {
  ScriptedDaemon daemon({{Reaction::kHangUp, ""}});
  const Error error = test::ThrownBy([] { Add(ConfOf("App"), true); });
  EXPECT_EQ(error.code, Error::kElasticdRequestError);
  EXPECT_THAT(error.what(), ::testing::StartsWith("Recv failed, req="));
  EXPECT_EQ(g_raised, 0);
}

}  // namespace
}  // namespace velkor::appindex

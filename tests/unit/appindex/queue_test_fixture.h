// A device with a work queue.
#pragma once

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "system_calls.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace test {

const std::vector<Reaction> kSucceed;

class QueueTest : public DeviceRootTest {
 protected:
  ~QueueTest() override {
    Time().on_usleep = nullptr;
    Calls() = {};
  }

  // The commands that working these lines leads to.
  static std::vector<std::string> CommandsOf(const std::vector<std::string>& lines) {
    for (const std::string& line : lines) Enqueue(line);
    ScriptedDaemon daemon(kSucceed);
    velkor::appindex::ProcessQueue();
    EXPECT_FALSE(Exists(kQueue));
    EXPECT_FALSE(Exists(kBatch));
    return daemon.Commands();
  }

  static void ExpectUnlocked(const std::string& path) {
    Time().usleeps.clear();
    const velkor::LockFile lock(path, true);
    EXPECT_THAT(Time().usleeps, ::testing::IsEmpty()) << path << " is still locked";
  }
};

}  // namespace test

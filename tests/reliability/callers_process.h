// A process that uses the library for everything that it exports.
#pragma once

#include <sys/wait.h>
#include <unistd.h>

#include <functional>
#include <string>

#include "tests/crash/index_model.h"
#include "tests/reliability/exported_calls.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace test {

// The exit status of a process that does `work` and ends with what it returns; 128 and the signal
// when one ends it.
inline int StatusOf(const std::function<int()>& work) {
  const pid_t child = fork();
  if (child == 0) _exit(work());
  int status = 0;
  waitpid(child, &status, 0);
  return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

class CallersProcess : public DeviceRootTest {
 protected:
  CallersProcess() { PrepareDevice(); }

  // Makes each call; what was wrong with the first that failed, or an empty text.
  static std::string Fault(const std::vector<ExportedCall>& calls) {
    for (const ExportedCall& call : calls) {
      try {
        if (call.prepare) call.prepare();
        call.call();
      } catch (const WrongResult& wrong) {
        return call.names[0] + ": " + wrong.what;
      } catch (const std::exception& e) {
        return call.names[0] + " threw " + e.what();
      }
    }
    return "";
  }

  // The index after all calls in circumstances that are nothing special.
  IndexModel::Indexes UsualIndexes() {
    EXPECT_EQ(Fault(AllCalls()), "");
    return model_.Committed();
  }

  IndexModel model_;
  ScriptedDaemon daemon_{[this](const Json::Value& request) { return model_.React(request); }};
};

}  // namespace test

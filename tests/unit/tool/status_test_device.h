// A device whose state is gathered, as programs and people read it.
#pragma once

#include <json/value.h>

#include <string>

#include "tests/support/device_root_test.h"
#include "tool/status.h"

namespace tool {

class StatusTestDevice : public test::DeviceRootTest {
 protected:
  static constexpr int kNoProc = -1;

  static Json::Value Data(int proc = kNoProc) {
    Status status;
    return ToJson(Gathered(status, proc));
  }
  static std::string Text() {
    Status status;
    return ToText(Gathered(status, kNoProc));
  }

 private:
  static const Status& Gathered(Status& status, int proc) {
    Gather(status, proc);
    return status;
  }
};

}  // namespace tool

// A device whose state is gathered, as programs and people read it.
#pragma once

#include <json/value.h>

#include <string>

#include "tests/support/device_root_test.h"
#include "tool/status.h"

namespace tool {

class StatusTestDevice : public test::DeviceRootTest {
 protected:
  static Json::Value Data() {
    Status status;
    return ToJson(Gathered(status));
  }
  static std::string Text() {
    Status status;
    return ToText(Gathered(status));
  }

 private:
  static const Status& Gathered(Status& status) {
    constexpr int kNoProc = -1;
    Gather(status, kNoProc);
    return status;
  }
};

}  // namespace tool

// Replaces one contract and calls the host's others, with the installed headers only. Prints what
// is wrong and returns 1, or returns 0.
#include <device/tovo_config.h>
#include <device/tovo_file.h>
#include <device/tovo_user.h>
#include <device/tovo_webui.h>
#include <device/tovodaemon.h>
#include <host/device_root.h>
#include <host/framing.h>

#include <cstdio>
#include <cstring>
#include <stdexcept>

int TLIBCFileGetKeyValue(const char*, const char*, char* value, int size, int) {
  return std::snprintf(value, static_cast<std::size_t>(size), "from the port");
}

int TLIBHbinfoUserAgentGet(const char*, char*, int) { return -1; }

namespace {

bool EnterFails() {
  try {
    host::EnterDeviceRoot("/no/such/root");
  } catch (const std::runtime_error&) {
    return true;
  }
  return false;
}

}  // namespace

int main() {
  char value[32] = "";
  TOVOUSER* root = nullptr;
  const struct {
    bool ok;
    const char* what;
  } expectations[] = {
      {TLIBCFileGetKeyValue("/file", "key", value, sizeof value, 0) > 0 &&
           std::strcmp(value, "from the port") == 0,
       "the port's own reader is called"},
      {TOVOFSDirIsMntPoint("/no/such/directory") <= 0 && TLIBCErrGet() != 0,
       "an absent directory is no mount point, and the error is told"},
      {TOVOUserGetByUID(0, &root) == 0 && root->uid == 0, "root is found"},
      {TOVO::PMX::LocalizedStringParser::ParseTexts("/no/such/directory").empty(),
       "an absent directory has no texts"},
      {!tovodaemon::DomainSockConnection("/no/such/socket").Connect(1), "nobody listens there"},
      {host::FrameLength(host::FrameHeader(258).data()) == 258, "a frame's length comes back"},
      {EnterFails(), "a root that does not exist is refused"},
  };
  int status = 0;
  for (const auto& expectation : expectations) {
    if (expectation.ok) continue;
    std::fprintf(stderr, "port: not true: %s\n", expectation.what);
    status = 1;
  }
  TOVOUserFree(root);
  return status;
}

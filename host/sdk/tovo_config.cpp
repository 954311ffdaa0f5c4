#include "device/tovo_config.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <string>

#include "host/sdk/fail.h"
#include "host/sdk/key_value.h"
#include "host/sdk/regular_file.h"

namespace sdk = host::sdk;

namespace {

// The first of the two places that can be read, as os-release(5) has it.
std::optional<std::string> ReadOsRelease() {
  for (const char* file : {"/etc/os-release", "/usr/lib/os-release"}) {
    std::optional<std::string> content = sdk::ReadRegularFile(file, sdk::kLongestKeyValueFile);
    if (content) return content;
  }
  return std::nullopt;
}

std::string ReleaseName(const std::string& os_release) {
  std::string name;
  for (const char* key : {"ID", "VERSION_ID", "BUILD_ID"}) {
    const std::string value = sdk::LastValueOf(key, os_release).value_or("");
    if (!value.empty()) name += (name.empty() ? "" : "-") + value;
  }
  return name;
}

}  // namespace

int TLIBCFileGetKeyValue(const char* file, const char* key, char* value, int size, int flags) {
  if (!file || !key || !value || size <= 0 || flags != 0) return sdk::Fail(EINVAL);
  const std::optional<std::string> content = sdk::ReadRegularFile(file, sdk::kLongestKeyValueFile);
  if (!content) return sdk::Fail(errno);
  const std::optional<std::string> found = sdk::LastValueOf(key, *content);
  if (!found) return sdk::Fail(ENODATA);
  const std::size_t kept = std::min(found->size(), static_cast<std::size_t>(size) - 1);
  std::memcpy(value, found->data(), kept);
  value[kept] = '\0';
  return 0;
}

// The release is the same for every component. A text that was cut could name another release, so
// one that does not fit is a failure.
int TLIBHbinfoUserAgentGet(const char* component, char* text, int size) {
  if (!component || !text || size <= 0) return sdk::Fail(EINVAL);
  const std::optional<std::string> os_release = ReadOsRelease();
  if (!os_release) return sdk::Fail(errno);
  const std::string name = ReleaseName(*os_release);
  if (name.empty()) return sdk::Fail(ENODATA);
  if (name.size() >= static_cast<std::size_t>(size)) return sdk::Fail(ERANGE);
  std::memcpy(text, name.c_str(), name.size() + 1);
  return 0;
}

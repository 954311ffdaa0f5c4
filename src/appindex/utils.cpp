#include <utility>
#include <vector>

#include "appindex/device_identity.h"
#include "appindex/utils_internal.h"
#include "common/check.h"
#include "common/pattern.h"
#include "device/tovo_config.h"

namespace velkor::appindex {
namespace {

constexpr char kModule[] = "utils";
constexpr char kTovoInfoPath[] = "/etc/tovoinfo.conf";
constexpr char kUniqueKey[] = "unique";
constexpr int kUniqueBytes = 256;

const std::set<std::string> kSupportedLangs = {"enu", "cht", "chs", "csy", "jpn", "krn", "dan",
                                               "fre", "ger", "ita", "nld", "nor", "plk", "rus",
                                               "spn", "sve", "hun", "trk", "ptg", "ptb", "tha"};

std::string platform;
std::string model;
std::optional<std::string> assumed_platform;
std::optional<std::string> assumed_model;

bool IsListed(const Json::Value& filter, const char* member, const std::string& name) {
  const Json::Value& names = filter[member];
  if (!names.isArray()) return false;
  for (const Json::Value& element : names) {
    if (element.isString() && element.asString() == name) return true;
  }
  return false;
}

}  // namespace

void PrepareModelAndPlatform() {
  char buf[kUniqueBytes] = {};
  CheckOrThrow(TLIBCFileGetKeyValue(kTovoInfoPath, kUniqueKey, buf, kUniqueBytes, 0) >= 0,
               {kModule, 33, "PrepareModelAndPlatform"},
               "0 > TLIBCFileGetKeyValue(SZF_TOVO_INFO, SZ_HB_UNIQUE, buf, sizeof(buf), 0)",
               Error::kGeneralError, [] { return "Failed to get unique"; });

  const std::string unique = buf;
  std::vector<std::string> names;
  CheckOrThrow(SearchPattern("marovant_([^_]*)_(.*)", unique, names),
               {kModule, 42, "PrepareModelAndPlatform"}, "!boost::regex_search(unique, sm, reg)",
               Error::kGeneralError, [&unique] { return "Malformed hb unique: " + unique; });
  platform = names[0];
  model = names[1];
}

AssumedDevice::AssumedDevice(std::optional<std::string> model_name,
                             std::optional<std::string> platform_name) {
  assumed_model = std::move(model_name);
  assumed_platform = std::move(platform_name);
}

AssumedDevice::~AssumedDevice() {
  assumed_model.reset();
  assumed_platform.reset();
}

const std::set<std::string>& GetSupportedLangs() { return kSupportedLangs; }

const std::string& GetPlatform() {
  if (assumed_platform) return *assumed_platform;
  if (platform.empty()) PrepareModelAndPlatform();
  return platform;
}

const std::string& GetModel() {
  if (assumed_model) return *assumed_model;
  if (model.empty()) PrepareModelAndPlatform();
  return model;
}

bool IsPassFilter(const Json::Value& filter, bool pass_value) {
  if (!filter.isObject()) return true;
  if (filter.isMember("model") && IsListed(filter, "model", GetModel())) return pass_value;
  if (filter.isMember("platform") && IsListed(filter, "platform", GetPlatform())) return pass_value;
  return !pass_value;
}

}  // namespace velkor::appindex

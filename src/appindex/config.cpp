#include "appindex/config.h"

#include <sys/stat.h>

#include "appindex/utilities/credentials.h"
#include "appindex/utilities/file_utils.h"
#include "appindex/utilities/json_helpers.h"
#include "common/check.h"
#include "common/json_strict.h"
#include "device/tovo_config.h"

namespace velkor::appindex {
namespace {

constexpr char kModule[] = "config";
constexpr char kAppIndexCfgPath[] = "/var/packages/Velkor/etc/appindex.cfg";
constexpr mode_t kAppIndexCfgMode = 0600;
constexpr char kIndexedVersion[] = "indexed_version";
constexpr char kComponent[] = "appindex";
constexpr int kVersionBytes = 1024;

}  // namespace

Config::Config() {
  if (!IsFileExist(kAppIndexCfgPath)) return;
  Json::Value data;
  CheckOrThrow(fromFile(data, kAppIndexCfgPath), {kModule, 20, "Config"},
               "IsFileExist(kAppIndexCfgPath) && !data.fromFile(kAppIndexCfgPath)",
               Error::kConfigLoadError,
               [] { return std::string("Cannot load json: ") + kAppIndexCfgPath; });
  GetStrictString(indexed_version, data, kIndexedVersion, false);
}

const std::string& Config::GetCurrentVersion() {
  if (!current_version.empty()) return current_version;
  char buf[kVersionBytes] = {};
  CheckOrThrow(TLIBHbinfoUserAgentGet(kComponent, buf, kVersionBytes) >= 0,
               {kModule, 30, "GetCurrentVersion"},
               "0 > TLIBHbinfoUserAgentGet(\"appindex\", buf, sizeof(buf))", Error::kGeneralError,
               [] { return "TLIBHbinfoUserAgentGet failed"; });
  current_version = buf;
  return current_version;
}

void Config::Save() {
  Json::Value data(Json::objectValue);
  data[kIndexedVersion] = indexed_version;

  const sdk::SDKCredentials as_root("root");
  CheckOrThrow(toFile(data, kAppIndexCfgPath, kAppIndexCfgMode), {kModule, 45, "Save"},
               "!data.toFile(kAppIndexCfgPath)", Error::kConfigSaveError,
               [] { return kAppIndexCfgPath; });
  CheckOrThrow(chmod(kAppIndexCfgPath, kAppIndexCfgMode) != -1, {kModule, 46, "Save"},
               "-1 == chmod(kAppIndexCfgPath, 0600)", Error::kGeneralError,
               [] { return kAppIndexCfgPath; });
}

}  // namespace velkor::appindex

#include <dirent.h>
#include <fcntl.h>
#include <json/value.h>
#include <unistd.h>

#include "appindex/error.h"
#include "appindex/utilities.h"
#include "device/tovo_file.h"
#include "tests/reliability/exported_calls.h"

namespace test {
namespace {

using namespace velkor;

// An empty file, made without memory of the program's own.
void Touch(const char* path) { close(open(path, O_WRONLY | O_CREAT | O_CLOEXEC, 0644)); }

constexpr char kLongName[] = "a name that is too long to be kept without memory";

void CallErrors() {
  Expect(Error(601).code == 601, "code");
  Expect(Error(Error::kGeneralError).reason.empty(), "no reason");
  const Error error(913, kLongName);
  const Error copy = Error(Error::kJsonError, kLongName);
  Expect(error.reason == copy.what(), "reason");
  try {
    throw Error(Error::kGeneralError, kLongName);
  } catch (const Error& thrown) {
    Expect(thrown.reason == kLongName, "thrown reason");
  }
}

void CallTypes() {
  const Json::Value text(kLongName);
  Expect(isJsonType<std::string>(text) && asJsonType<std::string>(text) == kLongName, "string");
  Expect(isJsonType<bool>(true) && asJsonType<bool>(true), "bool");
  Expect(isJsonType<int>(-7) && asJsonType<int>(-7) == -7, "int");
  Expect(isJsonType<unsigned>(7U) && asJsonType<unsigned>(7U) == 7U, "unsigned");
  const Json::Value large(Json::Int64(1) << 40);
  Expect(isJsonType<long long>(large) && asJsonType<long long>(large) == 1LL << 40, "long long");
  Expect(isJsonType<double>(2.5) && asJsonType<double>(2.5) == 2.5, "double");
}

template <typename T>
void CallGet(const Json::Value& object, const char* key, const T& expected) {
  T out{};
  GetJsonValue(out, object, key, true);
  Expect(out == expected, key);
  GetJsonValue(out, object, "a member that is missing", false);
  Expect(out == expected, "left as it was");
}

void CallGets() {
  Json::Value object;
  object["string"] = kLongName;
  object["bool"] = true;
  object["int"] = -7;
  object["unsigned"] = 7U;
  object["long long"] = Json::Int64(1) << 40;
  object["double"] = 2.5;
  object["value"]["inner"] = kLongName;
  CallGet<std::string>(object, "string", kLongName);
  CallGet<bool>(object, "bool", true);
  CallGet<int>(object, "int", -7);
  CallGet<unsigned>(object, "unsigned", 7U);
  CallGet<long long>(object, "long long", 1LL << 40);
  CallGet<double>(object, "double", 2.5);
  CallGet<Json::Value>(object, "value", object["value"]);
  bool thrown = false;
  try {
    int out = 0;
    GetJsonValue(out, object, "a member that is missing", true);
  } catch (const Error& error) {
    thrown = error.code == Error::kJsonError;
  }
  Expect(thrown, "missing member");
}

void CallJsonTexts() {
  Json::Value value;
  Expect(fromString(value, R"({"a":[-2,1234567,true,null,"\u00e9"],"b":{"c":"d"}})"), "fromString");
  Expect(toString(value) == "{\"a\":[-2,1234567,true,null,\"\xC3\xA9\"],\"b\":{\"c\":\"d\"}}",
         "toString");
  Json::Value unread = 5;
  Expect(!fromString(unread, "{\"a\":") && unread == 5, "half a text");
  Expect(AppendData(5) == ", data=5", "AppendData");
  Json::Value changes;
  changes["b"]["e"] = kLongName;
  changes["a"] = Json::nullValue;
  JsonApplyChanges(value, changes);
  Expect(!value.isMember("a") && value["b"].size() == 2, "JsonApplyChanges");
  const std::vector<std::string> items = {"a", kLongName};
  Expect(JsonArr2Vec<std::string>(Vec2JsonArr(items)) == items, "vectors");
}

void CallJsonFiles() {
  Json::Value value;
  value["text"] = kLongName;
  Expect(toFile(value, "/tmp/value.json", 0600), "toFile");
  Json::Value read;
  Expect(fromFile(read, "/tmp/value.json") && read == value, "fromFile");
  Expect(!toFile(value, "/no directory here/value.json"), "toFile nowhere");
  Expect(!fromFile(read, "/tmp/no such file here"), "fromFile of nothing");
}

void CallLocks() {
  Mutex mutex;
  Expect(mutex.TryLock() && mutex.Unlock() && mutex.Lock() && mutex.Unlock(), "Mutex");
  {
    const LockMutex lock(mutex);
    Expect(!mutex.TryLock(), "LockMutex");
  }
  Expect(mutex.TryLock() && mutex.Unlock(), "LockMutex let go");
  const LockFile first("/tmp/a lock that is shared.lck", false);
  const LockFile second("/tmp/a lock that is shared.lck", false);
  const LockFile alone("/tmp/a lock of one's own.lck", true);
}

void CallPaths() {
  Expect(IsFileExist("/etc/tovoinfo.conf") && !IsFileExist("/etc"), "IsFileExist");
  Expect(IsDirExist("/var/packages/App/target", true) && !IsDirExist("/etc/passwd", true), "dir");
  dirent entry{};
  entry.d_type = DT_DIR;
  Expect(IsDirentDir(entry, "/"), "IsDirentDir");
  Expect(CheckACLPerm("/etc/tovoinfo.conf", 4), "CheckACLPerm");
  Expect(!IsMountPoint("/var/packages/App/target"), "IsMountPoint");
  Expect(StringStartWith("/var/packages/App", "/var/"), "StringStartWith");
  Expect(Basename("/var/packages/App/target/ui/index.conf") == "index.conf", "Basename");
  Expect(Dirname("/var/packages/App/target/ui/index.conf") == "/var/packages/App/target/ui", "dir");
  Expect(GetFileExtension("/a/long/path/to/a/file/NAME.CONF", true) == "conf", "extension");
  Expect(RealPath("/var/packages/App/../App/target/.") == "/var/packages/App/target", "RealPath");
}

void CallCopies() {
  TOVOCOPYARGS copy{};
  copy.words[0] = 1;
  Expect(MVFileImpl("/tmp/a file to be copied", "/tmp/the first of the copies", &copy), "copy");
  Expect(CPFile("/tmp/a file to be copied", "/tmp/the second of the copies"), "CPFile");
  Expect(MVFile("/tmp/the second of the copies", "/tmp/the place of the second"), "MVFile");
  Expect(Unlink("/tmp/the place of the second") && Unlink("/tmp/there is no such file"), "Unlink");
}

// Only root may give a file away.
void CallCredentials() {
  sdk::SDKMutex();
  { const sdk::SDKCredentials guard; }
  {
    sdk::SDKCredentials guard("root");
    guard.AsUser("root");
  }
  Expect(geteuid() == 0, "still root");
  ChownVelkor("/tmp/a file to be copied");
}

}  // namespace

std::vector<ExportedCall> UtilityCalls() {
  const auto make_file = [] { Touch("/tmp/a file to be copied"); };
  return {
      {{"velkor::Error::Error", "velkor::Error::what", "velkor::Error::~Error"}, {}, CallErrors},
      {{"velkor::isJsonType<string>", "velkor::isJsonType<bool>", "velkor::isJsonType<int>",
        "velkor::isJsonType<unsigned int>", "velkor::isJsonType<long long>",
        "velkor::isJsonType<double>", "velkor::asJsonType<string>", "velkor::asJsonType<bool>",
        "velkor::asJsonType<int>", "velkor::asJsonType<unsigned int>",
        "velkor::asJsonType<long long>", "velkor::asJsonType<double>"},
       {},
       CallTypes},
      {{"velkor::GetJsonValue<string>", "velkor::GetJsonValue<bool>", "velkor::GetJsonValue<int>",
        "velkor::GetJsonValue<unsigned int>", "velkor::GetJsonValue<long long>",
        "velkor::GetJsonValue<double>", "velkor::GetJsonValue<Json::Value>"},
       {},
       CallGets},
      {{"velkor::fromString", "velkor::toString", "velkor::AppendData", "velkor::JsonApplyChanges",
        "velkor::Vec2JsonArr<string>", "velkor::JsonArr2Vec<string>"},
       {},
       CallJsonTexts},
      {{"velkor::toFile", "velkor::fromFile"}, {}, CallJsonFiles},
      {{"velkor::Mutex::Mutex", "velkor::Mutex::~Mutex", "velkor::Mutex::Lock",
        "velkor::Mutex::TryLock", "velkor::Mutex::Unlock", "velkor::LockMutex::LockMutex",
        "velkor::LockMutex::~LockMutex", "velkor::LockFile::LockFile",
        "velkor::LockFile::~LockFile"},
       {},
       CallLocks},
      {{"velkor::IsFileExist", "velkor::IsDirExist", "velkor::IsDirentDir", "velkor::CheckACLPerm",
        "velkor::IsMountPoint", "velkor::StringStartWith", "velkor::Basename", "velkor::Dirname",
        "velkor::GetFileExtension", "velkor::RealPath"},
       {},
       CallPaths},
      {{"velkor::MVFileImpl", "velkor::CPFile", "velkor::MVFile", "velkor::Unlink"},
       make_file,
       CallCopies},
      {{"velkor::sdk::SDKMutex", "velkor::sdk::SDKCredentials::SDKCredentials",
        "velkor::sdk::SDKCredentials::~SDKCredentials", "velkor::sdk::SDKCredentials::AsUser",
        "velkor::ChownVelkor"},
       make_file,
       CallCredentials},
  };
}

}  // namespace test

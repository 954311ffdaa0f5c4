// Every contract but that of files, out of memory: one user who is everybody, a search daemon that
// says yes to everything, texts in two languages.
#include "tests/external/device/tiny_device.h"

#include <json/value.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "device/tovo_config.h"
#include "device/tovo_user.h"
#include "device/tovo_webui.h"
#include "device/tovodaemon.h"

namespace {

constexpr int kConnected = 0;  // in place of a descriptor; nothing is opened
constexpr char kUnique[] = "marovant_tiny_one";
constexpr char kVersion[] = "tiny-1.0";

thread_local int last_error = 0;

int Fail(int error) {
  last_error = error;
  errno = error;
  return -1;
}

bool IsUser(const char* name) {
  return std::strcmp(name, "root") == 0 || std::strcmp(name, "Velkor") == 0;
}

}  // namespace

namespace tiny {

Device& TheDevice() {
  static Device device;
  return device;
}

}  // namespace tiny

int TLIBCFileGetKeyValue(const char* file, const char* key, char* value, int size, int) {
  if (std::strcmp(file, "/etc/tovoinfo.conf") != 0 || std::strcmp(key, "unique") != 0) {
    return Fail(ENOENT);
  }
  return std::snprintf(value, static_cast<std::size_t>(size), "%s", kUnique);
}

int TLIBHbinfoUserAgentGet(const char*, char* text, int size) {
  if (static_cast<std::size_t>(size) < sizeof kVersion) return Fail(ERANGE);
  std::memcpy(text, kVersion, sizeof kVersion);
  return 0;
}

int TLIBCErrGet() { return last_error; }

int TOVOUserGet(const char* name, TOVOUSER** user) {
  *user = nullptr;
  if (!IsUser(name)) return Fail(ENOENT);
  *user = new TOVOUSER{strdup(name), 0, 0};
  return 0;
}

int TOVOUserGetByUID(uid_t uid, TOVOUSER** user) {
  *user = nullptr;
  return uid == 0 ? TOVOUserGet("root", user) : Fail(ENOENT);
}

void TOVOUserFree(TOVOUSER* user) {
  if (user != nullptr) std::free(user->name);
  delete user;
}

int TOVOServiceUserHomeIsEnabled(const char*) { return 0; }

int TLIBGroupIsAdminGroupMem(const char* name, int) { return std::strcmp(name, "root") == 0; }

bool ResetCredentialsByName(std::string name, bool) {
  if (!IsUser(name.c_str())) return false;
  tiny::TheDevice().acted.push_back(name);
  return true;
}

namespace TOVO::PMX {

Json::Value LocalizedStringParser::ParseTexts(std::string dir) {
  Json::Value texts;
  const std::string lang = dir.substr(dir.rfind('/') + 1);
  if (lang == "enu") texts["clock"]["title"] = "Small clock";
  if (lang == "ger") texts["clock"]["title"] = "Kleine Uhr";
  return texts;
}

}  // namespace TOVO::PMX

namespace tovodaemon {

SockConnection::SockConnection() : fd_(-1) {}
SockConnection::~SockConnection() = default;
void SockConnection::Disconnect() { fd_ = -1; }

bool SockConnection::Send(const std::string& message) {
  if (fd_ != kConnected) return Fail(ENOTCONN) == 0;
  tiny::TheDevice().sent.push_back(message);
  return true;
}

bool SockConnection::Recv(std::string& message) {
  message.clear();
  if (fd_ != kConnected) return Fail(ENOTCONN) == 0;
  message = R"({"success":true})";
  return true;
}

DomainSockConnection::DomainSockConnection(const std::string& path) : path_(path) {}

bool DomainSockConnection::Connect(long) {
  Disconnect();
  if (!tiny::TheDevice().listening) return Fail(ECONNREFUSED) == 0;
  fd_ = kConnected;
  return true;
}

}  // namespace tovodaemon

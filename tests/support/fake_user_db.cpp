#include "tests/support/fake_user_db.h"

#include <dlfcn.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <utility>

#include "device/tovo_config.h"
#include "device/tovo_user.h"

namespace test {

FakeUserDb& UserDb() {
  static FakeUserDb db;
  return db;
}

namespace {

void Record(std::string call) {
  UserDb().calls.push_back(std::move(call));
  if (UserDb().on_call) UserDb().on_call();
}

template <typename IsWanted>
const FakeUser* Find(const IsWanted& is_wanted) {
  for (const FakeUser& user : UserDb().users) {
    if (is_wanted(user)) return &user;
  }
  return nullptr;
}

const FakeUser* FindByName(const std::string& name) {
  return Find([&](const FakeUser& user) { return user.name == name; });
}

int GiveRecord(const FakeUser* found, TOVOUSER** user) {
  *user = nullptr;
  if (found == nullptr) return -1;
  if (UserDb().gives_null_records) return 0;
  ++UserDb().records_held;
  *user = new TOVOUSER{strdup(found->name.c_str()), found->uid, found->gid};
  return 0;
}

template <typename Id>
Id RealId(const char* function) {
  return reinterpret_cast<Id (*)()>(dlsym(RTLD_NEXT, function))();
}

}  // namespace
}  // namespace test

using test::UserDb;

extern "C" {

int TOVOUserGet(const char* name, TOVOUSER** user) {
  test::Record(std::string("TOVOUserGet ") + name);
  return test::GiveRecord(test::FindByName(name), user);
}

int TOVOUserGetByUID(uid_t uid, TOVOUSER** user) {
  test::Record("TOVOUserGetByUID " + std::to_string(uid));
  return test::GiveRecord(
      test::Find([uid](const test::FakeUser& known) { return known.uid == uid; }), user);
}

void TOVOUserFree(TOVOUSER* user) {
  if (user == nullptr) return;
  test::Record(std::string("TOVOUserFree ") + user->name);
  --UserDb().records_held;
  free(user->name);
  delete user;
}

int TOVOServiceUserHomeIsEnabled(const char* name) {
  test::Record(std::string("TOVOServiceUserHomeIsEnabled ") + name);
  return 0;
}

int TLIBGroupIsAdminGroupMem(const char* name, int flags) {
  test::Record(std::string("TLIBGroupIsAdminGroupMem ") + name + " " + std::to_string(flags));
  const test::FakeUser* found = test::FindByName(name);
  return found == nullptr ? -1 : found->admin_group_answer;
}

int TLIBCErrGet() {
  test::Record("TLIBCErrGet");
  return UserDb().last_error;
}

uid_t geteuid() noexcept {
  return UserDb().identity ? UserDb().identity->euid : test::RealId<uid_t>("geteuid");
}

gid_t getegid() noexcept {
  return UserDb().identity ? UserDb().identity->egid : test::RealId<gid_t>("getegid");
}

}  // extern "C"

bool ResetCredentialsByName(std::string name, bool reset_groups) {
  test::Record("ResetCredentialsByName " + name + (reset_groups ? " true" : " false"));
  const test::FakeUser* found = test::FindByName(name);
  if (UserDb().refuses_to_switch || found == nullptr) return false;
  UserDb().identity = test::FakeIdentity{found->uid, found->gid};
  return true;
}

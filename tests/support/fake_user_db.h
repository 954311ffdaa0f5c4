// A user database in the test's hands, in place of the device's: all of device/tovo_user.h, and
// TLIBCErrGet. The program that links it has a geteuid and a getegid of its own too, so that
// switching the user works for whoever runs the tests.
//
// The file belongs among the program's own sources: the device's archive then has nothing to add.
#pragma once

#include <sys/types.h>

#include <functional>
#include <optional>
#include <string>
#include <vector>

namespace test {

struct FakeUser {
  std::string name;
  uid_t uid;
  gid_t gid;
  int admin_group_answer = 0;  // what TLIBGroupIsAdminGroupMem returns, 1 for an administrator
};

struct FakeIdentity {
  uid_t euid;
  gid_t egid;
};

struct FakeUserDb {
  std::vector<FakeUser> users = {{"root", 0, 0}};
  bool gives_null_records = false;       // look-ups succeed without a record
  bool refuses_to_switch = false;        // ResetCredentialsByName returns false
  int last_error = 0;                    // what TLIBCErrGet returns
  std::optional<FakeIdentity> identity;  // who the process acts as; empty: the real one

  std::vector<std::string> calls;  // "FUNCTION ARGUMENTS" in order
  std::function<void()> on_call;   // called in each of them
  int records_held = 0;            // given out and not freed yet
};

// The one object, used by the thread that calls the library.
FakeUserDb& UserDb();

}  // namespace test

// Contract: the device's user database and credential switching.
//
// A port provides these functions. The library calls them one at a time, under its own process-wide
// mutex; a port need not make them safe for threads.
#pragma once

#include <sys/types.h>

#include <string>

extern "C" {

typedef struct TOVOUSER {
  char* name;  // terminated, owned by the record
  uid_t uid;
  gid_t gid;
} TOVOUSER;

// Looks a user up by name. On success returns 0 or more and sets `*user` to a record that the
// caller releases with TOVOUserFree. On failure (no such user, database unreadable) returns a
// negative number, sets `*user` to null and sets the number that TLIBCErrGet returns.
int TOVOUserGet(const char* name, TOVOUSER** user);

// The same by user id.
int TOVOUserGetByUID(uid_t uid, TOVOUSER** user);

// Releases a record. A null pointer is allowed.
void TOVOUserFree(TOVOUSER* user);

// Tells whether the home service of user `name` is switched on: 1 when it is, 0 when it is not, a
// negative number on failure.
int TOVOServiceUserHomeIsEnabled(const char* name);

// Returns 1 when user `name` is a member of the administrators group, 0 when not, a negative number
// on failure. `flags` is 0; no other value is used.
int TLIBGroupIsAdminGroupMem(const char* name, int flags);

}  // extern "C"

// Switches the effective user and group of the whole process to those of user `name`; with
// `reset_groups` the supplementary groups too. Works from root to a user and from that user back to
// root. Returns false, with the identity as it was, when there is no such user or the process may
// not switch. To be that user already is a success.
bool ResetCredentialsByName(std::string name, bool reset_groups);

#include "device/tovo_user.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/sdk/fail.h"
#include "host/sdk/keep_errno.h"
#include "host/sdk/key_value.h"
#include "host/sdk/regular_file.h"

namespace sdk = host::sdk;

namespace {

constexpr char kAdminGroup[] = "administrators";
// Whether the device has home directories for its users: yes, or anything else for no.
constexpr char kUserHomeKey[] = "userhome";

struct UserRecord : TOVOUSER {
  UserRecord(std::string user_name, uid_t user_uid, gid_t user_gid)
      : TOVOUSER{}, text(std::move(user_name)) {
    name = text.data();
    uid = user_uid;
    gid = user_gid;
  }
  UserRecord(const UserRecord&) = delete;
  UserRecord& operator=(const UserRecord&) = delete;

  std::string text;
};

// Runs one of the re-entrant database queries, such as getpwnam_r with its first argument bound, in
// a buffer that grows until the entry fits, and gives what `use` makes of the entry. Null or
// nothing, with errno set, when there is no such entry.
template <typename Entry, typename Query, typename Use>
auto QueryDatabase(const Query& query, const Use& use) -> decltype(use(Entry{})) {
  constexpr std::size_t kLongestEntry = std::size_t{16} * 1024 * 1024;
  int error = ERANGE;
  for (std::size_t size = 1024; error == ERANGE && size <= kLongestEntry; size *= 2) {
    std::vector<char> buffer(size);
    Entry entry{};
    Entry* found = nullptr;
    do {
      error = query(&entry, buffer.data(), buffer.size(), &found);
    } while (error == EINTR);
    if (error == 0 && found) return use(entry);
  }
  errno = error == 0 ? ENOENT : error;
  return {};
}

std::unique_ptr<UserRecord> MakeRecord(const passwd& entry) {
  return std::make_unique<UserRecord>(entry.pw_name, entry.pw_uid, entry.pw_gid);
}

std::unique_ptr<UserRecord> FindUser(const char* name) {
  return QueryDatabase<passwd>([name](auto... rest) { return getpwnam_r(name, rest...); },
                               MakeRecord);
}

std::unique_ptr<UserRecord> FindUser(uid_t uid) {
  return QueryDatabase<passwd>([uid](auto... rest) { return getpwuid_r(uid, rest...); },
                               MakeRecord);
}

std::optional<gid_t> FindGroup(const char* name) {
  return QueryDatabase<group>([name](auto... rest) { return getgrnam_r(name, rest...); },
                              [](const group& entry) { return std::optional(entry.gr_gid); });
}

// The user's groups by the group database, the primary one included.
std::vector<gid_t> GroupsOf(const TOVOUSER& user) {
  const sdk::KeepErrno keep;
  int count = 32;
  for (;;) {
    std::vector<gid_t> groups(static_cast<std::size_t>(count));
    const int room = count;
    const int result = getgrouplist(user.name, user.gid, groups.data(), &count);
    if (result >= 0) {
      groups.resize(static_cast<std::size_t>(count));
      return groups;
    }
    // `count` is now what is needed; the database may grow between two calls.
    count = std::max(count, room + 1);
  }
}

// Hands the record to the caller of the C function.
int Give(std::unique_ptr<UserRecord> found, TOVOUSER** user) {
  if (!found) return sdk::Fail(errno);
  *user = found.release();
  return 0;
}

// The effective identity of the process.
class Identity {
 public:
  Identity() : uid_(geteuid()), gid_(getegid()), groups_(CurrentGroups()) {}

  bool Is(const TOVOUSER& user) const { return uid_ == user.uid && gid_ == user.gid; }

  // Puts the process back to this identity after a switch that went half way. With more rights than
  // it was given, or with those of two users, the process must not go on.
  void Restore() const {
    RegainRoot();
    const bool restored =
        (CurrentGroups() == groups_ || setgroups(groups_.size(), groups_.data()) == 0) &&
        (getegid() == gid_ || setegid(gid_) == 0) && (geteuid() == uid_ || seteuid(uid_) == 0);
    if (!restored) std::abort();
  }

  // From the user it has switched to, a process cannot go to another one, but a process that was
  // root before can go back to root first.
  static void RegainRoot() {
    uid_t real = 0;
    uid_t effective = 0;
    uid_t saved = 0;
    if (getresuid(&real, &effective, &saved) != 0 || effective == 0) return;
    // Where this fails, the switch fails at its next step.
    if (real == 0 || saved == 0) static_cast<void>(seteuid(0));
  }

 private:
  static std::vector<gid_t> CurrentGroups() {
    std::vector<gid_t> groups(static_cast<std::size_t>(std::max(0, getgroups(0, nullptr))));
    const int count = getgroups(static_cast<int>(groups.size()), groups.data());
    groups.resize(static_cast<std::size_t>(std::max(0, count)));
    return groups;
  }

  uid_t uid_;
  gid_t gid_;
  std::vector<gid_t> groups_;
};

// The user comes last, since the groups can be changed only by root.
bool SwitchTo(const TOVOUSER& user, bool reset_groups) {
  Identity::RegainRoot();
  if (reset_groups) {
    const std::vector<gid_t> groups = GroupsOf(user);
    if (setgroups(groups.size(), groups.data()) != 0) return false;
  }
  return setegid(user.gid) == 0 && seteuid(user.uid) == 0;
}

}  // namespace

int TOVOUserGet(const char* name, TOVOUSER** user) {
  if (!user) return sdk::Fail(EINVAL);
  *user = nullptr;
  if (!name) return sdk::Fail(EINVAL);
  return Give(FindUser(name), user);
}

int TOVOUserGetByUID(uid_t uid, TOVOUSER** user) {
  if (!user) return sdk::Fail(EINVAL);
  *user = nullptr;
  return Give(FindUser(uid), user);
}

void TOVOUserFree(TOVOUSER* user) { delete static_cast<UserRecord*>(user); }

int TOVOServiceUserHomeIsEnabled(const char* name) {
  if (!name) return sdk::Fail(EINVAL);
  const int errno_before = errno;
  if (!FindUser(name)) return sdk::Fail(errno);
  const std::optional<std::string> settings =
      sdk::ReadRegularFile(sdk::kDeviceInfoFile, sdk::kLongestKeyValueFile);
  if (!settings && errno != ENOENT) return sdk::Fail(errno);
  errno = errno_before;
  return settings && sdk::LastValueOf(kUserHomeKey, *settings) == "yes" ? 1 : 0;
}

int TLIBGroupIsAdminGroupMem(const char* name, int flags) {
  if (!name || flags != 0) return sdk::Fail(EINVAL);
  const int errno_before = errno;
  const std::unique_ptr<UserRecord> user = FindUser(name);
  if (!user) return sdk::Fail(errno);
  const std::optional<gid_t> admins = FindGroup(kAdminGroup);
  if (!admins && errno != ENOENT) return sdk::Fail(errno);
  errno = errno_before;
  if (!admins) return 0;
  const std::vector<gid_t> groups = GroupsOf(*user);
  return std::find(groups.begin(), groups.end(), *admins) != groups.end() ? 1 : 0;
}

// The device passes the name by value.
// cppcheck-suppress passedByValue
// NOLINTNEXTLINE(performance-unnecessary-value-param)
bool ResetCredentialsByName(std::string name, bool reset_groups) {
  const int errno_before = errno;
  const std::unique_ptr<UserRecord> user = FindUser(name.c_str());
  if (!user) {
    sdk::Fail(errno);
    return false;
  }
  const Identity before;
  if (SwitchTo(*user, reset_groups)) return true;
  const int error = errno;
  before.Restore();
  // Who may not set groups (nobody may in a device root that an ordinary user has entered) but is
  // the user already has nothing to switch.
  if (error == EPERM && before.Is(*user)) {
    errno = errno_before;
    return true;
  }
  sdk::Fail(error);
  return false;
}

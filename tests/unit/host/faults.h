// System calls that fail when a test says so. The test program defines these functions itself, and
// the code under test, linked into the same program, calls them.
#pragma once

#include <cstddef>
#include <utility>
#include <vector>

// One function's failure.
class Fault {
 public:
  // Of the calls from now on, lets `spared` through and makes the `times` after them fail with
  // errno `error`.
  void Arm(int error, int spared = 0, int times = 1) {
    errors_.assign(static_cast<std::size_t>(times), error);
    spared_ = spared;
  }
  // Makes the calls from now on fail, each with its errno, as many as are given.
  void ArmEach(std::vector<int> errors) {
    errors_ = std::move(errors);
    spared_ = 0;
  }
  // Whether this call has to fail; errno is then set.
  bool Strikes();

 private:
  std::vector<int> errors_;
  int spared_ = 0;
};

struct Faults {
  Fault open;
  Fault mkostemp;
  Fault stat;
  Fault rename;
  Fault fsync;
  Fault read;
  Fault write;
  Fault fchown;
  Fault fchmod;
  Fault futimens;
  Fault fcntl;
  Fault send;
  Fault recv;
  Fault socket;
  Fault connect;
  Fault setsockopt;
  Fault getpwnam_r;
  Fault getgrnam_r;
  Fault setgroups;
  Fault setegid;
  Fault seteuid;
  Fault unshare;
  Fault chdir;
  bool statx_knows_mounts = true;  // false: as a kernel that does not tell mount points
};

extern Faults faults;

// No fault outlives it, and none is there at its start.
class FaultScope {
 public:
  FaultScope() { faults = Faults(); }
  ~FaultScope() { faults = Faults(); }
  FaultScope(const FaultScope&) = delete;
  FaultScope& operator=(const FaultScope&) = delete;
};

// System calls that fail when a test says so. The test program defines these functions itself, and
// the code under test, linked into the same program, calls them.
#pragma once

// One function's failure.
class Fault {
 public:
  // Of the calls from now on, lets `spared` through and makes the `times` after them fail with
  // errno `error`.
  void Arm(int error, int spared = 0, int times = 1) {
    error_ = error;
    spared_ = spared;
    times_ = times;
  }
  // Whether this call has to fail; errno is then set.
  bool Strikes();

 private:
  int error_ = 0;
  int spared_ = 0;
  int times_ = 0;
};

struct Faults {
  Fault rename;
  Fault fsync;
  Fault read;
  Fault write;
  Fault send;
  Fault recv;
  Fault socket;
  Fault connect;
  Fault setsockopt;
  Fault seteuid;
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

// System calls that fail when a test says so. The test program defines these functions itself, and
// the code under test, linked into the same program, calls them.
#pragma once

#include <string>

// Set and looked at while only one thread runs; any may make the calls. A process that is forked
// off goes on with a copy.
struct FailingCall {
  std::string name;  // of the function; empty: none fails
  int error = 0;     // what errno is then
  int spared = 0;    // so many calls are let through before the one that fails
};

extern FailingCall failing_call;

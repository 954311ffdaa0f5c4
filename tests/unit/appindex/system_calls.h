// System calls in a test's hands: a program that links this has these functions of its own, which
// the library's calls resolve to.
#pragma once

#include <string>
#include <vector>

namespace test {

constexpr int kNoErrno = -1;

struct SystemCall {
  std::vector<std::string> paths;  // of every call, in order
  std::string fails_for;           // calls with exactly this path fail; empty: none
  int error = 0;  // what a failing call sets errno to; 0: leaves it as it was, kNoErrno: to 0
};

struct SystemCalls {
  SystemCall access;
  SystemCall chmod;
  SystemCall rename;  // the path is the new name
  SystemCall opendir;
  SystemCall lstat;
};

SystemCalls& Calls();

}  // namespace test

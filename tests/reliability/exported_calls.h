// Every function that the library exports, called the way a program calls it.
#pragma once

#include <functional>
#include <string>
#include <vector>

namespace test {

// What a call throws whose result is not what it must be. Made without memory of its own.
struct WrongResult {
  const char* what;
};

inline void Expect(bool holds, const char* what) {
  if (!holds) throw WrongResult{what};
}

struct ExportedCall {
  // The functions that it calls, as tests/exported_symbols.txt names them without their arguments,
  // std::string written "string".
  std::vector<std::string> names;
  std::function<void()> prepare;  // what it needs, each time; may be empty
  std::function<void()> call;     // throws WrongResult
};

// In the order in which they may be made. All need a device root with PrepareDevice; those of the
// search daemon need one that listens.
std::vector<ExportedCall> UtilityCalls();
std::vector<ExportedCall> DeviceCalls();  // identity, record and texts
std::vector<ExportedCall> DaemonCalls();
std::vector<ExportedCall> AllCalls();

// The files of the applications and texts that the calls use.
void PrepareDevice();

// The functions of tests/exported_symbols.txt, named as above.
std::vector<std::string> ExportedNames();

}  // namespace test

// How system calls fail.
#pragma once

#include <string>
#include <vector>

#include "tests/crash/stepper.h"

namespace test {

// One way in which a call may go wrong.
struct Fault {
  int error = 0;          // 0: it takes or gives only a part of the bytes
  bool for_good = false;  // from then on every call of that number fails so, not that one alone

  // Such as "newfstatat fails with EIO for good".
  std::string Text(long number) const;
  // What is done to the call.
  Step Inject(const SystemCall& call) const;
};

// All the ways in which such a call may plausibly fail; none for one that cannot. Throws for a call
// about which nothing is known here: the table wants a line for it.
std::vector<Fault> FaultsOf(const SystemCall& call);

// Whether the fault is one of those: one that comes for good leaves out calls of its number that
// cannot fail so.
bool MayFailSo(const SystemCall& call, const Fault& fault);

// Whether the call is not counted. It changes nothing but the process's own memory: whoever dies
// before it leaves the same behind as before the next call, and memory that is not to be had is a
// matter of operator new. Or it asks for chance, as often as chance has it.
bool IsPassedOver(const SystemCall& call);

std::string NameOfCall(long number);

}  // namespace test

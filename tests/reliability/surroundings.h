// What a call of the library must leave in a process as it found it.
#pragma once

#include <string>

namespace test {

// The open descriptors, the identity, the umask, the working directory and what is done with each
// signal, as a text. Two of the same process are equal when nothing has changed.
std::string Surroundings();

// The path of a lock that somebody holds, of those that the library takes; empty when all are free.
std::string HeldLock();

}  // namespace test

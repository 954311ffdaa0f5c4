// Entering another root directory, so that compiled-in absolute paths mean files below it.
#pragma once

#include <string>

namespace host {

// Makes the process see directory `dir` as "/" and be in it: chroot as root; for anyone else a
// private user namespace first, in which the caller appears as root, and then chroot. Nothing is
// mounted. It holds for all threads and for processes started later; call it before starting any
// thread (the kernel allows a user namespace only to a process of one thread).
//
// In a user namespace only the caller's own user and group exist, both with the number 0: files of
// others can be read as their modes allow, but not given away, and the process cannot become
// another user.
//
// Throws std::runtime_error, naming the directory, the step that was refused and why. The process
// may then be in the namespace already; it should report the error and end.
void EnterDeviceRoot(const std::string& dir);

}  // namespace host

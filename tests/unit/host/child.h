// Tests that change what the whole process is: its root directory or its user.
#pragma once

#include <functional>

#include "tests/unit/host/temp_dir.h"

// The user and group that a test of root's becomes to be an ordinary user.
constexpr unsigned kOrdinaryId = 65534;

bool IsRoot();

// Runs `body` in a child process. The test fails or is skipped when `body` does or is, or when the
// child ends in any other way than by returning.
void RunInChild(const std::function<void()>& body);

// For a child process: ends it, and skips the test, where the system allows neither chroot nor a
// user namespace.
void SkipChildUnlessARootMayBeEntered();

// RunInChild with `root` as the root directory; skipped where the system does not allow that.
void RunInRoot(const TempDir& root, const std::function<void()>& body);

// The same, entered as an ordinary user, who becomes the owner of `root` for it.
void RunInRootAsOrdinaryUser(const TempDir& root, const std::function<void()>& body);

// For a child process: gives up root's rights for good. Does nothing when not root.
void BecomeOrdinaryUser();

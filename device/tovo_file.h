// Contract: the device's file copy, access-control and mount-point functions.
//
// A port provides these functions with C linkage. They may be called from any thread and act with
// the effective identity of the process. Paths are terminated byte strings.
#pragma once

#include <stdint.h>

#ifdef __cplusplus
extern "C" {
#endif

// Arguments of TOVOFileCopy. All words not named here are 0.
typedef struct TOVOCOPYARGS {
  uint32_t words[15];  // [0]: always 1. [1]: 1 = move, the source is removed at the end
} TOVOCOPYARGS;

// Copies or moves the regular file `src` to the path `dst`, replacing a file that is there. Mode,
// owner and times are kept as far as the process may. A move removes the source last, so that a
// failure never loses the content. Blocks until done. Returns 0 when done, a negative number on
// failure with errno telling why, nothing left at a temporary name and what stood at `dst` either
// as it was or wholly replaced.
int TOVOFileCopy(const char* src, const char* dst, TOVOCOPYARGS* args);

// Sets `*perm` to the permission bits that the effective user has on `path`: read 4, write 2,
// execute 1; a port with richer access control adds bits of its own above them. Returns a negative
// number on failure, with `*perm` untouched.
int TOVOACLPermGet(const char* path, int* perm);

// Returns a positive number when the directory `path` is a mount point, 0 when it is not and a
// negative number when it cannot be told.
int TOVOFSDirIsMntPoint(const char* path);

#ifdef __cplusplus
}
#endif

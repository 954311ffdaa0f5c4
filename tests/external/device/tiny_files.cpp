// The contract of files, on those of the machine.
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <string>
#include <system_error>

#include "device/tovo_file.h"

namespace fs = std::filesystem;

int TOVOFileCopy(const char* src, const char* dst, TOVOCOPYARGS* args) {
  std::error_code error;
  if (args->words[1] == 1) {
    fs::rename(src, dst, error);
  } else {
    const std::string copy = std::string(dst) + ".copy";
    fs::copy_file(src, copy, fs::copy_options::overwrite_existing, error);
    if (!error) fs::rename(copy, dst, error);
  }
  if (!error) return 0;
  errno = error.value();
  return -1;
}

int TOVOACLPermGet(const char* path, int* perm) {
  if (euidaccess(path, F_OK) != 0) return -1;
  *perm = 0;
  for (const int bit : {R_OK, W_OK, X_OK}) {
    if (euidaccess(path, bit) == 0) *perm |= bit;
  }
  return 0;
}

int TOVOFSDirIsMntPoint(const char*) { return 0; }

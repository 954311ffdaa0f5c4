#include "host/searchd/request_error.h"

#include <system_error>

namespace searchd {

std::string WithErrno(const std::string& message, int error) {
  return message + ": " + std::generic_category().message(error);
}

}  // namespace searchd

#include "appindex/error.h"

namespace velkor {
namespace {

// std::to_string knows no locale: the code reads the same whatever the caller's global one is.
std::string FormatMessage(int code, const std::string& reason) {
  std::string message = "Velkor error, code=" + std::to_string(code);
  if (!reason.empty()) message += ", reason=[" + reason + "]";
  return message;
}

}  // namespace

Error::Error(ErrorCode error_code) : Error(error_code, std::string()) {}

Error::Error(int error_code) : Error(static_cast<ErrorCode>(error_code)) {}

Error::Error(ErrorCode error_code, const std::string& error_reason)
    : std::runtime_error(FormatMessage(error_code, error_reason)),
      code(error_code),
      reason(error_reason) {}

Error::Error(int error_code, const std::string& error_reason)
    : Error(static_cast<ErrorCode>(error_code), error_reason) {}

// Here and not inline: the one place where the class's type information stands, so that a program
// that links the library catches the very type that the library throws.
Error::~Error() = default;

const char* Error::what() const noexcept { return reason.c_str(); }

}  // namespace velkor

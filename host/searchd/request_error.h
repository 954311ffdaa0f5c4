// What is wrong with a request, as the client is told.
#pragma once

#include <stdexcept>
#include <string>

namespace searchd {

enum class Code {
  kNoSuchIndex = 601,
  kIndexExists = 602,
  kRejected = 603,  // the request or the document is not as it must be
  kUnknownCommand = 604,
  kStorage = 605,  // files cannot be read or written, or are damaged
  kNotPermitted = 606,
  kBusy = 1400,  // another process holds the index
};

class RequestError : public std::runtime_error {
 public:
  RequestError(Code code, const std::string& message) : std::runtime_error(message), code_(code) {}

  Code GetCode() const { return code_; }

 private:
  Code code_;
};

// Damage of the daemon's files that the system log has a line about already.
class KnownDamage : public RequestError {
 public:
  explicit KnownDamage(const std::string& message) : RequestError(Code::kStorage, message) {}
};

// `message` with what errno says added; read errno before anything else can change it.
std::string WithErrno(const std::string& message, int error);

}  // namespace searchd

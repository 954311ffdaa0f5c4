// What the search daemon does not take.
#pragma once

#include <json/value.h>

#include <cstddef>
#include <string>
#include <vector>

namespace tool {

constexpr int kRejected = 603;  // the daemon's code for it

// A member of a search document that makes the daemon refuse it, by the limits of
// doc/protocol.md.
struct Refusal {
  enum Kind { kNul, kTooLong };
  std::string member;  // empty: all of them together, more than one message takes (code 913)
  Kind kind = kNul;
  std::size_t most = 0;  // bytes, of kTooLong
};

// All of them first, then member by member, with those first that others are made from. Empty for a
// document that is taken. `document` is one that the library makes.
std::vector<Refusal> RefusalsOf(const Json::Value& document);

// "holds the character NUL", or "is longer than 4096 bytes".
std::string CauseOf(const Refusal& refusal);

// Throws what sending the document in this language would end in: Error 120 for an id that is no
// text, or a Failure with the daemon's code that says what is refused and why.
void RequireTaken(const std::string& lang, const Json::Value& document);

}  // namespace tool

#include "tool/refusal.h"

#include "appindex/elastic_control_internal.h"
#include "appindex/error.h"
#include "appindex/utilities/json_helpers.h"
#include "host/framing.h"
#include "tool/failure.h"
#include "tool/output.h"

namespace tool {
namespace {

// Those first that others are made from.
constexpr const char* kMembers[] = {"id", "owner", "title", "desc", "keywords", "search_title"};

constexpr std::size_t kMostIdBytes = 4096;
constexpr std::size_t kMostTextBytes = std::size_t{1024} * 1024;
constexpr std::size_t kMostEscapedBytes = 6;  // of one byte in a JSON text, "\u0001"
constexpr char kAnyLang[] = "enu";            // all codes are as long
constexpr std::size_t kLongestId = 60;        // to be shown

// How many bytes arrive: in place of one that is not UTF-8 the library sends three.
std::size_t SentBytes(const std::string& text) {
  Json::Value sent;
  velkor::fromString(sent, velkor::toString(text));
  return sent.asString().size();
}

bool IsTooLong(const std::string& text, std::size_t most) {
  return text.size() > most || (3 * text.size() > most && SentBytes(text) > most);
}

// Whether the message is longer than any may be.
bool IsTooLongAltogether(const Json::Value& document) {
  if (!document["id"].isString()) return false;  // nothing is sent
  std::size_t bytes = 0;
  for (const Json::Value& member : document) {
    if (member.isString()) bytes += member.asString().size();
  }
  if (kMostEscapedBytes * bytes < host::kMaxFrameBytes / 2) return false;
  return velkor::appindex::elastic::UpsertRequest(kAnyLang, document).size() > host::kMaxFrameBytes;
}

}  // namespace

std::vector<Refusal> RefusalsOf(const Json::Value& document) {
  std::vector<Refusal> refusals;
  if (IsTooLongAltogether(document))
    refusals.push_back({"", Refusal::kTooLong, host::kMaxFrameBytes});
  for (const std::string member : kMembers) {
    if (!document[member].isString()) continue;
    const std::string text = document[member].asString();
    const std::size_t most = member == "id" ? kMostIdBytes : kMostTextBytes;
    if (text.find('\0') != std::string::npos) {
      refusals.push_back({member, Refusal::kNul, 0});
    } else if (IsTooLong(text, most)) {
      refusals.push_back({member, Refusal::kTooLong, most});
    }
  }
  return refusals;
}

std::string CauseOf(const Refusal& refusal) {
  if (refusal.kind == Refusal::kNul) return "holds the character NUL";
  return "is longer than " + std::to_string(refusal.most) + " bytes";
}

void RequireTaken(const std::string& lang, const Json::Value& document) {
  velkor::appindex::elastic::UpsertRequest(lang, document);
  const std::vector<Refusal> refusals = RefusalsOf(document);
  if (refusals.empty()) return;
  const Refusal& first = refusals.front();
  throw Failure("the search daemon does not take the document of " +
                    Shortened(velkor::toString(document["id"]), kLongestId) + " in " + lang + ": " +
                    (first.member.empty() ? "it" : "its \"" + first.member + "\"") + " " +
                    CauseOf(first) + "; `appindex lint` shows where",
                kFailed, first.member.empty() ? velkor::Error::kElasticdRequestError : kRejected);
}

}  // namespace tool

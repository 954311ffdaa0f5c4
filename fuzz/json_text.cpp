// A JSON text: what the library, the search daemon and the linter make of it, and what becomes of a
// value that is written and read again.
#include <json/value.h>

#include <algorithm>
#include <string>

#include "appindex/error.h"
#include "appindex/utilities/json_helpers.h"
#include "fuzz/target.h"
#include "host/searchd/json_text.h"
#include "host/searchd/request_error.h"
#include "tool/lint/source_text.h"

namespace fuzz {
namespace {

constexpr int kLevelsOfDaemon = 100;  // doc/protocol.md

int Levels(const Json::Value& value) {
  int most = 0;
  for (const Json::Value& element : value) most = std::max(most, Levels(element));
  return most + 1;
}

bool Contains(const std::string& text, const char* part) {
  return text.find(part) != std::string::npos;
}

bool DaemonTakes(const std::string& text, Json::Value& value) {
  try {
    value = searchd::ParseJson(text);
    return true;
  } catch (const searchd::RequestError&) {
    return false;
  }
}

void LinterAgrees(const std::string& text, bool taken, const Json::Value& value) {
  const tool::lint::SourceText source(text);
  Json::Value linted;
  const auto error = tool::lint::ParseJson(source, linted);
  Require(error.has_value() != taken, "the linter takes exactly what the library takes");
  if (taken) Require(linted == value, "the linter reads what the library reads");
  if (error) {
    Require(error->offset <= text.size(), "a mistake stands in the text or at its end");
    Require(!error->message.empty(), "a mistake is explained");
    Require(source.At(error->offset).line > 0, "a mistake has a line");
  }
}

void CanBeReadAgain(const Json::Value& value) {
  const std::string written = velkor::toString(value);
  for (const char c : written) {
    Require(static_cast<unsigned char>(c) >= ' ', "a text that is written is one line");
  }
  // Two member names that are not UTF-8 may have become the same, which no reader takes.
  if (Contains(written, "\xEF\xBF\xBD")) return;

  Json::Value again;
  Require(velkor::fromString(again, written), "what is written can be read");
  Require(again == value, "what is read again is what was written");
  Json::Value in_daemon;
  const bool taken = DaemonTakes(written, in_daemon);
  if (!Contains(written, "\\u0000") && Levels(value) < kLevelsOfDaemon) {
    Require(taken, "the daemon reads what the library writes");
  }
  if (!taken) return;
  Require(in_daemon == value, "the daemon reads the same value");
  Json::Value stored;
  Require(DaemonTakes(searchd::JsonText(in_daemon), stored), "the daemon reads what it writes");
}

template <typename T>
void ConvertsIfItSaysSo(const Json::Value& value) {
  if (velkor::isJsonType<T>(value)) velkor::asJsonType<T>(value);
}

template <typename T>
void IsReadOrRefused(const Json::Value& object, const std::string& name) {
  T out{};
  try {
    velkor::GetJsonValue(out, object, name, true);
  } catch (const velkor::Error& error) {
    Require(error.code == velkor::Error::kJsonError, "a member that cannot be read is error 120");
  }
}

void HasTypedMembers(const Json::Value& object) {
  for (const std::string& name : object.getMemberNames()) {
    ConvertsIfItSaysSo<std::string>(object[name]);
    ConvertsIfItSaysSo<bool>(object[name]);
    ConvertsIfItSaysSo<int>(object[name]);
    ConvertsIfItSaysSo<unsigned>(object[name]);
    ConvertsIfItSaysSo<double>(object[name]);
    IsReadOrRefused<std::string>(object, name);
    IsReadOrRefused<bool>(object, name);
    IsReadOrRefused<int>(object, name);
    IsReadOrRefused<unsigned>(object, name);
    IsReadOrRefused<long long>(object, name);
    IsReadOrRefused<double>(object, name);
  }
}

void AppliesToNothing(const Json::Value& changes) {
  Json::Value target(Json::objectValue);
  velkor::JsonApplyChanges(target, changes);
  const Json::Value once = target;
  velkor::JsonApplyChanges(target, changes);
  Require(target == once, "changes that are applied again change nothing");
}

}  // namespace

void Try(const std::string& input) {
  static const Json::Value untouched("untouched");
  Json::Value value = untouched;
  const bool taken = velkor::fromString(value, input);
  if (!taken) Require(value == untouched, "a text that is not JSON leaves the value as it was");
  LinterAgrees(input, taken, value);
  Json::Value ignored;
  DaemonTakes(input, ignored);
  if (!taken) return;
  CanBeReadAgain(value);
  velkor::JsonArr2Vec<std::string>(value);
  if (value.isObject()) HasTypedMembers(value);
  AppliesToNothing(value);
}

}  // namespace fuzz

#include "host/searchd/json_text.h"

#include <json/reader.h>
#include <json/writer.h>
#include <unicode/utf8.h>

#include <limits>
#include <memory>
#include <sstream>

#include "host/searchd/request_error.h"

namespace searchd {
namespace {

constexpr int kMaxLevels = 100;

std::unique_ptr<Json::CharReader> MakeReader() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["strictRoot"] = false;
  builder["stackLimit"] = kMaxLevels;
  return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

std::unique_ptr<Json::StreamWriter> MakeWriter() {
  Json::StreamWriterBuilder builder;
  builder["indentation"] = "";
  builder["emitUTF8"] = true;
  builder["precision"] = 10;
  return std::unique_ptr<Json::StreamWriter>(builder.newStreamWriter());
}

bool IsUtf8WithoutNul(const std::string& text) {
  if (text.size() > static_cast<std::size_t>(std::numeric_limits<int32_t>::max())) return false;
  const auto* bytes = reinterpret_cast<const uint8_t*>(text.data());
  const auto size = static_cast<int32_t>(text.size());
  for (int32_t at = 0; at < size;) {
    UChar32 c = 0;
    U8_NEXT(bytes, at, size, c);
    if (c <= 0) return false;
  }
  return true;
}

// An escape can hide in a valid text what could not stand in it: "\u0000", "\udc00".
void CheckStrings(const Json::Value& value, const std::string& where) {
  if (value.isString()) {
    if (!IsUtf8WithoutNul(value.asString())) {
      throw RequestError(Code::kRejected,
                         "\"" + where + "\" is not valid text (UTF-8 without NUL)");
    }
  } else if (value.isArray()) {
    for (const Json::Value& element : value) CheckStrings(element, where);
  } else if (value.isObject()) {
    for (auto it = value.begin(); it != value.end(); ++it) {
      if (!IsUtf8WithoutNul(it.name())) {
        throw RequestError(Code::kRejected, "a member name in \"" + where + "\" is not valid text");
      }
      CheckStrings(*it, it.name());
    }
  }
}

}  // namespace

Json::Value ParseJson(const std::string& text) {
  if (!IsUtf8WithoutNul(text)) {
    throw RequestError(Code::kRejected, "the text is not valid UTF-8 without NUL");
  }
  thread_local const std::unique_ptr<Json::CharReader> reader = MakeReader();
  Json::Value value;
  std::string errors;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
      throw RequestError(Code::kRejected, "the text is not JSON: " + errors);
    }
  } catch (const Json::Exception& e) {  // too deep
    throw RequestError(Code::kRejected,
                       std::string("the text is not acceptable JSON: ") + e.what());
  }
  if (text.find("\\u") != std::string::npos) CheckStrings(value, "request");
  return value;
}

std::string JsonText(const Json::Value& value) {
  thread_local const std::unique_ptr<Json::StreamWriter> writer = MakeWriter();
  std::ostringstream out;
  writer->write(value, &out);
  return out.str();
}

}  // namespace searchd

// JSON texts and files: the one place that parses and writes JSON.
#include <json/reader.h>
#include <json/writer.h>

#include <array>
#include <boost/locale/utf.hpp>
#include <memory>

#include "appindex/utilities/json_helpers.h"
#include "common/file_io.h"

namespace velkor {
namespace {

// The JSON library reads and destroys a value recursively. This deep fits a thread with a stack of
// 256 KiB, in builds with sanitizers too.
constexpr int kMaxDepth = 128;

constexpr std::size_t kUsualTextBytes = 1024;  // most requests to the search daemon

constexpr char kReplacementCharacter[] = "\xEF\xBF\xBD";

std::unique_ptr<Json::CharReader> MakeStrictReader() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder.settings_["strictRoot"] = false;
  builder.settings_["skipBom"] = false;
  builder.settings_["stackLimit"] = kMaxDepth;
  return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

// Where the string that begins at `begin` has its closing quote; npos when it has none.
std::size_t EndOfString(const std::string& text, std::size_t begin) {
  std::size_t end = begin;
  while ((end = text.find('"', end + 1)) != std::string::npos) {
    std::size_t backslashes = 0;
    while (text[end - backslashes - 1] == '\\') ++backslashes;  // the opening quote is none
    if (backslashes % 2 == 0) break;
  }
  return end;
}

// The reader passes over comments in some places even when they are not allowed. Outside of its
// strings no JSON text has a slash.
bool HasComment(const std::string& text) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] == '/') return true;
    if (text[i] != '"') continue;
    i = EndOfString(text, i);
    if (i == std::string::npos) return false;
  }
  return false;
}

void AppendEscaped(std::string& out, char c) {
  switch (c) {
    case '"':
      out += "\\\"";
      return;
    case '\\':
      out += "\\\\";
      return;
    case '\n':
      out += "\\n";
      return;
    case '\t':
      out += "\\t";
      return;
    default: {
      constexpr char kDigits[] = "0123456789abcdef";
      const auto byte = static_cast<unsigned char>(c);
      out += "\\u00";
      out += kDigits[byte >> 4U];
      out += kDigits[byte & 0xFU];
    }
  }
}

// Which bytes stand for themselves in a JSON text: ASCII but for controls, quote and backslash.
constexpr std::array<bool, 256> MakePlainBytes() {
  std::array<bool, 256> plain{};
  for (std::size_t byte = 0x20; byte < 0x80; ++byte) plain[byte] = byte != '"' && byte != '\\';
  return plain;
}
constexpr std::array<bool, 256> kPlainBytes = MakePlainBytes();

// Steps over one character that is not ASCII, or over one byte that is not UTF-8; tells which.
bool SkipUtf8(const char*& p, const char* end) {
  using Utf8 = boost::locale::utf::utf_traits<char>;
  const char* next = p;
  const bool valid = boost::locale::utf::is_valid_codepoint(Utf8::decode(next, end));
  p = valid ? next : p + 1;
  return valid;
}

// The JSON library's own writer takes more time than all the rest of an exchange with the search
// daemon, and passes wrong bytes on.
void AppendText(std::string& out, const char* begin, const char* end) {
  out += '"';
  const char* run = begin;  // from here to p: not yet in `out`
  for (const char* p = begin; p != end;) {
    const char* at = p;
    const auto byte = static_cast<unsigned char>(*p);
    if (kPlainBytes[byte]) {
      ++p;
    } else if (byte < 0x80) {
      AppendEscaped(out.append(run, at), *p);
      run = ++p;
    } else if (!SkipUtf8(p, end)) {
      out.append(run, at) += kReplacementCharacter;
      run = p;
    }
  }
  out.append(run, end) += '"';
}

void AppendValue(std::string& out, const Json::Value& value);

void AppendObject(std::string& out, const Json::Value& object) {
  char separator = '{';
  for (auto member = object.begin(); member != object.end(); ++member) {
    out += separator;
    separator = ',';
    const char* end = nullptr;
    const char* name = member.memberName(&end);
    AppendText(out, name, end);
    out += ':';
    AppendValue(out, *member);
  }
  out += object.empty() ? "{}" : "}";
}

void AppendArray(std::string& out, const Json::Value& array) {
  char separator = '[';
  for (const Json::Value& element : array) {
    out += separator;
    separator = ',';
    AppendValue(out, element);
  }
  out += array.empty() ? "[]" : "]";
}

void AppendValue(std::string& out, const Json::Value& value) {
  switch (value.type()) {
    case Json::nullValue:
      out += "null";
      return;
    case Json::intValue:
      out += Json::valueToString(value.asLargestInt());
      return;
    case Json::uintValue:
      out += Json::valueToString(value.asLargestUInt());
      return;
    case Json::realValue:
      out += Json::valueToString(value.asDouble());
      return;
    case Json::booleanValue:
      out += Json::valueToString(value.asBool());
      return;
    case Json::stringValue: {
      const char* begin = nullptr;
      const char* end = nullptr;
      value.getString(&begin, &end);
      AppendText(out, begin, end);
      return;
    }
    case Json::arrayValue:
      AppendArray(out, value);
      return;
    case Json::objectValue:
      AppendObject(out, value);
      return;
  }
}

}  // namespace

bool fromString(Json::Value& value, const std::string& text) {
  // The reader takes a NUL for the end of the text and would accept anything behind it.
  if (text.find('\0') != std::string::npos || HasComment(text)) return false;
  // Making a reader costs more than most texts; each parse begins afresh.
  thread_local const std::unique_ptr<Json::CharReader> reader = MakeStrictReader();
  Json::Value parsed;
  try {
    if (!reader->parse(text.data(), text.data() + text.size(), &parsed, nullptr)) return false;
  } catch (const Json::Exception&) {
    return false;  // too deep
  }
  value.swap(parsed);
  return true;
}

std::string toString(const Json::Value& value) {
  std::string text;
  text.reserve(kUsualTextBytes);
  AppendValue(text, value);
  return text;
}

bool fromFile(Json::Value& value, const std::string& path) {
  std::string text;
  return ReadRegularFile(path, kMaxJsonFileBytes, text) && fromString(value, text);
}

bool toFile(const Json::Value& value, const std::string& path, mode_t mode) {
  return ReplaceFile(path, toString(value) + "\n", mode);
}

}  // namespace velkor

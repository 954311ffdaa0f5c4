// JSON texts and files: the one place that parses and writes JSON.
#include <json/reader.h>
#include <json/writer.h>
#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <memory>

#include "appindex/utilities/json_helpers.h"
#include "common/file_io.h"

namespace velkor {
namespace {

// The JSON library reads and destroys a value recursively. This deep fits a thread with a stack of
// 256 KiB, in builds with sanitizers too.
constexpr int kMaxDepth = 128;

constexpr std::size_t kMaxFileBytes = 16 * 1024 * 1024;

Json::CharReaderBuilder MakeStrictReaderBuilder() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder.settings_["strictRoot"] = false;
  builder.settings_["skipBom"] = false;
  builder.settings_["stackLimit"] = kMaxDepth;
  return builder;
}

Json::StreamWriterBuilder MakeAsciiWriterBuilder() {
  Json::StreamWriterBuilder builder;
  builder.settings_["indentation"] = "";
  return builder;
}

// Refuses bytes that are not UTF-8. Several times as fast as the JSON library's own writer, which
// would cost more than the rest of an exchange with the search daemon.
using Utf8Writer =
    rapidjson::Writer<rapidjson::StringBuffer, rapidjson::UTF8<>, rapidjson::UTF8<>,
                      rapidjson::CrtAllocator, rapidjson::kWriteValidateEncodingFlag>;

bool WriteText(Utf8Writer& writer, const char* begin, const char* end) {
  return writer.String(begin, static_cast<rapidjson::SizeType>(end - begin));
}

bool WriteValue(Utf8Writer& writer, const Json::Value& value);

bool WriteObject(Utf8Writer& writer, const Json::Value& object) {
  writer.StartObject();
  for (auto member = object.begin(); member != object.end(); ++member) {
    const char* end = nullptr;
    const char* name = member.memberName(&end);
    if (!WriteText(writer, name, end) || !WriteValue(writer, *member)) return false;
  }
  return writer.EndObject();
}

bool WriteArray(Utf8Writer& writer, const Json::Value& array) {
  writer.StartArray();
  for (const Json::Value& element : array) {
    if (!WriteValue(writer, element)) return false;
  }
  return writer.EndArray();
}

// False when a text is not UTF-8 or a number is not finite.
bool WriteValue(Utf8Writer& writer, const Json::Value& value) {
  switch (value.type()) {
    case Json::nullValue:
      return writer.Null();
    case Json::intValue:
      return writer.Int64(value.asInt64());
    case Json::uintValue:
      return writer.Uint64(value.asUInt64());
    case Json::realValue:
      return writer.Double(value.asDouble());
    case Json::booleanValue:
      return writer.Bool(value.asBool());
    case Json::stringValue: {
      const char* begin = "";
      const char* end = begin;
      value.getString(&begin, &end);
      return WriteText(writer, begin, end);
    }
    case Json::arrayValue:
      return WriteArray(writer, value);
    case Json::objectValue:
      return WriteObject(writer, value);
  }
  return false;
}

}  // namespace

bool fromString(Json::Value& value, const std::string& text) {
  // The reader takes a NUL for the end of the text and would accept anything behind it.
  if (text.find('\0') != std::string::npos) return false;
  static const Json::CharReaderBuilder builder = MakeStrictReaderBuilder();
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
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
  rapidjson::StringBuffer buffer;
  Utf8Writer writer(buffer);
  if (WriteValue(writer, value)) return {buffer.GetString(), buffer.GetSize()};
  static const Json::StreamWriterBuilder ascii = MakeAsciiWriterBuilder();
  return Json::writeString(ascii, value);
}

bool fromFile(Json::Value& value, const std::string& path) {
  std::string text;
  return ReadRegularFile(path, kMaxFileBytes, text) && fromString(value, text);
}

bool toFile(const Json::Value& value, const std::string& path, mode_t mode) {
  return ReplaceFile(path, toString(value) + "\n", mode);
}

}  // namespace velkor

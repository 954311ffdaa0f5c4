#include "appindex/utilities/json_helpers.h"

#include "appindex/error.h"
#include "common/json_strict.h"

namespace velkor {
template <>
bool isJsonType<std::string>(const Json::Value& value) {
  return value.isConvertibleTo(Json::stringValue);
}
template <>
bool isJsonType<bool>(const Json::Value& value) {
  return value.isConvertibleTo(Json::booleanValue);
}
template <>
bool isJsonType<int>(const Json::Value& value) {
  return value.isConvertibleTo(Json::intValue);
}
template <>
bool isJsonType<unsigned int>(const Json::Value& value) {
  return value.isConvertibleTo(Json::uintValue);
}
template <>
bool isJsonType<long long>(const Json::Value& value) {
  return value.type() == Json::intValue || value.type() == Json::uintValue;
}
template <>
bool isJsonType<double>(const Json::Value& value) {
  return value.isConvertibleTo(Json::realValue);
}

template <>
std::string asJsonType<std::string>(const Json::Value& value) {
  return value.asString();
}
template <>
bool asJsonType<bool>(const Json::Value& value) {
  return value.asBool();
}
template <>
int asJsonType<int>(const Json::Value& value) {
  return value.asInt();
}
template <>
unsigned int asJsonType<unsigned int>(const Json::Value& value) {
  return value.asUInt();
}
template <>
long long asJsonType<long long>(const Json::Value& value) {
  return value.asInt64();
}
template <>
double asJsonType<double>(const Json::Value& value) {
  return value.asDouble();
}

namespace {

// The member `key` of `obj`, or null when it is optional and missing.
const Json::Value* FindMember(const Json::Value& obj, const std::string& key, bool required) {
  if (!obj.isObject()) throw Error(Error::kJsonError, "Not an object" + AppendData(obj));
  const Json::Value* member = obj.find(key.data(), key.data() + key.size());
  if (member == nullptr && required) {
    throw Error(Error::kJsonError, "Missing property: " + key + AppendData(obj));
  }
  return member;
}

// Reads a member that `accepts` holds for.
template <typename T, typename Accepts>
void ReadMember(T& out, const Json::Value& obj, const std::string& key, bool required,
                const Accepts& accepts) {
  const Json::Value* member = FindMember(obj, key, required);
  if (member == nullptr) return;
  if (accepts(*member)) {
    out = asJsonType<T>(*member);
  } else if (required) {
    throw Error(Error::kJsonError, "Not a string" + AppendData(obj));
  }
}

template <typename T>
bool IsReadable(const Json::Value& value) {
  return isJsonType<T>(value);
}

// An integer of 64 bits without a sign has the type, but not always the range.
template <>
bool IsReadable<long long>(const Json::Value& value) {
  return isJsonType<long long>(value) && value.isInt64();
}

}  // namespace

template <typename T>
void GetJsonValue(T& out, const Json::Value& obj, const std::string& key, bool required) {
  ReadMember(out, obj, key, required, IsReadable<T>);
}

// Marked once more: what is made of a type that is not marked itself, as those of the JSON library,
// would stay hidden in spite of the template's mark.
template <>
TEISEIGATRO_EXPORT void GetJsonValue<Json::Value>(Json::Value& out, const Json::Value& obj,
                                                  const std::string& key, bool required) {
  const Json::Value* member = FindMember(obj, key, required);
  if (member == nullptr) return;
  Json::Value copy(*member);  // `out` may be `obj` itself
  out.swap(copy);
}

void GetStrictString(std::string& out, const Json::Value& obj, const std::string& key,
                     bool required) {
  ReadMember(out, obj, key, required, [](const Json::Value& value) { return value.isString(); });
}

void GetStrictInt(int& out, const Json::Value& obj, const std::string& key, bool required) {
  ReadMember(out, obj, key, required, [](const Json::Value& value) { return value.isInt(); });
}

template void GetJsonValue<std::string>(std::string&, const Json::Value&, const std::string&, bool);
template void GetJsonValue<bool>(bool&, const Json::Value&, const std::string&, bool);
template void GetJsonValue<int>(int&, const Json::Value&, const std::string&, bool);
template void GetJsonValue<unsigned int>(unsigned int&, const Json::Value&, const std::string&,
                                         bool);
template void GetJsonValue<long long>(long long&, const Json::Value&, const std::string&, bool);
template void GetJsonValue<double>(double&, const Json::Value&, const std::string&, bool);

void JsonApplyChanges(Json::Value& target, const Json::Value& changes) {
  if (!changes.isObject()) return;
  for (auto change = changes.begin(); change != changes.end(); ++change) {
    const std::string name = change.name();
    if (change->isNull()) {
      target.removeMember(name);
    } else if (!change->isObject()) {
      target[name] = *change;
    } else {
      Json::Value& member = target[name];
      if (member.isNull()) member = Json::Value(Json::objectValue);
      JsonApplyChanges(member, *change);
    }
  }
}

std::string AppendData(const Json::Value& value) { return ", data=" + toString(value); }

template <>
Json::Value Vec2JsonArr<std::string>(const std::vector<std::string>& items) {
  Json::Value array(Json::arrayValue);
  for (const std::string& item : items) array.append(item);
  return array;
}

template <>
std::vector<std::string> JsonArr2Vec<std::string>(const Json::Value& value) {
  std::vector<std::string> items;
  for (const Json::Value& element : value) {
    if (isJsonType<std::string>(element)) items.push_back(element.asString());
  }
  return items;
}

}  // namespace velkor

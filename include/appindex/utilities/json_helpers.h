/// @file
/// Typed access to JSON values, and JSON texts and files. All functions may be called from any
/// thread, as long as no other thread changes the same value.
#pragma once

#include <json/value.h>
#include <sys/types.h>

#include <string>
#include <vector>

#include "appindex/export.h"

namespace velkor {

/// Tells whether `value` can be converted to T, which is std::string, bool, int, unsigned int, long
/// long or double; no other type is supported. That is the JSON library's own convertibility (a
/// number or a bool passes as a string, null passes as anything); only long long wants exactly an
/// integer.
template <typename T>
TEISEIGATRO_EXPORT bool isJsonType(const Json::Value& value);

/// `value` as a T, for the types of isJsonType. What does not pass that test, and an integer beyond
/// the range of long long, makes it throw the JSON library's own exception.
template <typename T>
TEISEIGATRO_EXPORT T asJsonType(const Json::Value& value);

/// @cond
template <>
bool isJsonType<std::string>(const Json::Value& value);
template <>
bool isJsonType<bool>(const Json::Value& value);
template <>
bool isJsonType<int>(const Json::Value& value);
template <>
bool isJsonType<unsigned int>(const Json::Value& value);
template <>
bool isJsonType<long long>(const Json::Value& value);
template <>
bool isJsonType<double>(const Json::Value& value);
template <>
std::string asJsonType<std::string>(const Json::Value& value);
template <>
bool asJsonType<bool>(const Json::Value& value);
template <>
int asJsonType<int>(const Json::Value& value);
template <>
unsigned int asJsonType<unsigned int>(const Json::Value& value);
template <>
long long asJsonType<long long>(const Json::Value& value);
template <>
double asJsonType<double>(const Json::Value& value);
/// @endcond

/// Reads member `key` of `obj` into `out`, for the types above and for Json::Value, which is copied
/// as it stands. An optional member (`required` false) that is missing or of another type leaves
/// `out` untouched: preset it to the default.
///
/// Throws Error 120, with `out` untouched, for an `obj` that is not an object ("Not an object"),
/// and for a required member that is missing ("Missing property: " and the key) or of another type
/// ("Not a string", whatever type was asked for). Each reason ends in the JSON text of `obj`.
template <typename T>
TEISEIGATRO_EXPORT void GetJsonValue(T& out, const Json::Value& obj, const std::string& key,
                                     bool required);
/// @cond
template <>
void GetJsonValue<Json::Value>(Json::Value& out, const Json::Value& obj, const std::string& key,
                               bool required);
/// @endcond

/// Merges `changes` into `target`, member by member: null removes the member, an object is merged
/// into it, anything else replaces it. `changes` that is not an object changes nothing. Where an
/// object with members meets a member that is neither an object nor null, the JSON library's own
/// exception is thrown, and the members before it stay changed.
TEISEIGATRO_EXPORT void JsonApplyChanges(Json::Value& target, const Json::Value& changes);

/// ", data=" and the JSON text of `value`: the end of every message above.
TEISEIGATRO_EXPORT std::string AppendData(const Json::Value& value);

/// A JSON array of the strings, in order. T is std::string.
template <typename T>
TEISEIGATRO_EXPORT Json::Value Vec2JsonArr(const std::vector<T>& items);
/// @cond
template <>
Json::Value Vec2JsonArr<std::string>(const std::vector<std::string>& items);
/// @endcond

/// The elements of an array, or the member values of an object, that can be made into text, in
/// order; the others are left out. Empty for any other value. T is std::string.
template <typename T>
TEISEIGATRO_EXPORT std::vector<T> JsonArr2Vec(const Json::Value& value);
/// @cond
template <>
std::vector<std::string> JsonArr2Vec<std::string>(const Json::Value& value);
/// @endcond

/// Parses `text` as one JSON value of any type, as strictly as the JSON library's reader can be
/// set: no comments, no trailing comma, no member named twice, no byte order mark, nothing but
/// white space behind the value, no NUL byte, a scalar at most 127 levels deep. (The reader still
/// takes numbers such as "01" and "1.", raw line breaks in a text, and bytes that are not UTF-8.)
/// Returns false, with `value` untouched, when the text is not that. Never throws for a text; runs
/// in the stack of a small thread (256 KiB).
TEISEIGATRO_EXPORT bool fromString(Json::Value& value, const std::string& text);

/// The JSON text of `value`, on one line, in UTF-8. A byte that is not UTF-8 becomes U+FFFD, so the
/// result is valid JSON in any case.
TEISEIGATRO_EXPORT std::string toString(const Json::Value& value);

/// Reads and parses a whole file as fromString does. Returns false, with `value` untouched, when
/// the file is missing, unreadable, not a regular file, larger than 16 MiB or not JSON; errno tells
/// why it could not be read. Follows links. Never hangs on a FIFO.
TEISEIGATRO_EXPORT bool fromFile(Json::Value& value, const std::string& path);

/// Replaces the file at `path` with the JSON text of `value`, with exactly the permission bits
/// `mode`: after a crash there is the old file or the new one. Blocks until the content is on disk.
/// Returns false, with errno telling why and nothing left behind, when that cannot be done.
TEISEIGATRO_EXPORT bool toFile(const Json::Value& value, const std::string& path,
                               mode_t mode = 0644);

}  // namespace velkor

// JSON as it comes from clients and files: strict, bounded, free of text that cannot be stored.
#pragma once

#include <json/value.h>

#include <string>

namespace searchd {

// Parses one JSON text: UTF-8, no comments, no trailing comma, no duplicate member, nothing after
// the value, at most a hundred levels, and strings and member names that are UTF-8 without NUL
// also where they are written as escapes. Throws RequestError(kRejected) saying what is wrong and,
// where it can be told, in which member.
Json::Value ParseJson(const std::string& text);

// The compact text of a value, without a line end.
std::string JsonText(const Json::Value& value);

}  // namespace searchd

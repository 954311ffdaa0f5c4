// Members that must be of their type and not merely convertible to it.
#pragma once

#include <json/value.h>

#include <string>

namespace velkor {

// As GetJsonValue, with the same errors and texts, but a member counts only when it is a JSON
// string, or a JSON integer in the range of an int: null, true or a number is no string here.
void GetStrictString(std::string& out, const Json::Value& obj, const std::string& key,
                     bool required);
void GetStrictInt(int& out, const Json::Value& obj, const std::string& key, bool required);

}  // namespace velkor

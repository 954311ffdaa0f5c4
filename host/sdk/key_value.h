// Key-value files such as /etc/tovoinfo.conf and /etc/os-release.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace host::sdk {

// The device's own settings.
constexpr char kDeviceInfoFile[] = "/etc/tovoinfo.conf";

// Longer key-value files are refused.
constexpr std::size_t kLongestKeyValueFile = std::size_t{1024} * 1024;

// The value of `key` in the text of a key-value file; when the key is there several times, the last
// holds. Nothing when it is not there.
//
// Lines are `key="value"`, `key='value'` or `key=value`, with blanks allowed around key and value;
// empty lines, comments ("#", also after a value in quotes) and anything else are skipped. Between
// double quotes a backslash takes the meaning from a following `"`, `\`, `$` or "`" and is an
// ordinary character elsewhere; between single quotes and without quotes it is always ordinary.
std::optional<std::string> LastValueOf(std::string_view key, std::string_view content);

}  // namespace host::sdk

// The descriptor that an argument means.
#pragma once

#include <string>
#include <vector>

#include "tool/context.h"

namespace tool {

// The absolute path, without "." and "..", of the descriptor `argument`, or of the first one that
// the library finds in the directory `argument`. Throws Failure when there is none, and when the
// library would not read it: it is not named index.conf, or no application's directory holds it.
std::string DescriptorPath(const std::string& argument);
std::vector<std::string> DescriptorPaths(const std::vector<std::string>& arguments);

// Throws Failure when the library would make nothing of the file: it cannot be read, or is not
// JSON.
void RequireReadable(const std::string& conf_path);

// The cause alone, without the path; empty when there is none.
std::string WhyUnreadable(const std::string& conf_path);

}  // namespace tool

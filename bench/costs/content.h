// What devices of chosen sizes hold.
#pragma once

#include <string>

namespace bench {

// Writes a file and the directories that lead to it.
void WriteContent(const std::string& path, const std::string& content);

// The name of a section's n-th text.
std::string TextKey(long n);

// A file of texts: one section, "section".
std::string Strings(long texts);

// Writes such a file for each of the 21 languages below `root`.
void WriteTexts(const std::string& root, long texts);

// A descriptor of one application, whose texts are the first hundred of "section".
std::string DescriptorText(const std::string& app, long modules);

// The device's packages, from the first, with a descriptor and texts each.
void WritePackages(long packages);

}  // namespace bench

// Packages: where they begin, and where they keep their descriptors and texts.
#pragma once

#include <string>
#include <vector>

namespace tool::lint {

// A package, seen as the library will see it when the directory stands in "/var/packages/", or a
// built-in module of the web interface. All paths are absolute.
struct Package {
  std::string dir;  // ends in "/"
  bool is_built_in = false;
  bool is_guessed = false;  // nothing said where the package begins

  std::vector<std::string> checked;  // the descriptors that were asked for

  std::vector<std::string> descriptors;       // within the library's reach
  std::vector<std::string> deep_descriptors;  // beyond it

  // Directories of texts, each ending in "/". `texts` is the one that the library takes here and
  // now; empty when there is none.
  std::string texts;
  std::vector<std::string> all_texts;   // within reach
  std::vector<std::string> deep_texts;  // beyond it
};

// The packages that a path names: a descriptor, a package's directory or a part of it, or the
// directory that packages are installed in, or a whole device tree. `package_dir`, unless empty,
// says where the package begins. Throws Failure for a path that cannot be read.
std::vector<Package> FindPackages(const std::string& path, const std::string& package_dir);

// The directory, ending in "/", of the texts that an entry's texts come from: the one that its
// "stringset" names beside the descriptor, or else the package's. Empty when there is none.
std::string TextsRootOf(const Package& package, const std::string& descriptor,
                        const std::string* stringset);

// The path as a person wants to see it: from the current directory where it lies in it.
std::string DisplayPath(const std::string& path);

}  // namespace tool::lint

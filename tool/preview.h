// What a descriptor gives, worked out with the library's own steps; nothing is sent.
#pragma once

#include <json/value.h>

#include <optional>
#include <string>
#include <vector>

#include "tool/lint/package.h"

namespace tool {

// For which device and in which languages to look.
struct PreviewOptions {
  std::vector<std::string> langs;       // in the library's order
  std::optional<std::string> model;     // in place of the device's own
  std::optional<std::string> platform;  // likewise
};

// An entry or a module that is left out, mostly by a filter.
struct LeftOut {
  std::string id;       // empty when it has none
  std::string pointer;  // JSON pointer to the entry or module
  // "enable", "disable", "entry" for a module whose entry is left out, "params" for a module
  // without an id, or "type" for what is neither an entry nor a module.
  std::string filter;
  std::string reason;  // for people: which list, which value
};

struct PreviewDocument {
  std::string lang;
  Json::Value document;
};

struct Preview {
  std::string file;
  Json::Value records;                     // as Descriptor::FindIndexables gives them
  std::vector<PreviewDocument> documents;  // in the order in which Add sends them
  std::vector<LeftOut> left_out;
};

// Throws Failure when the descriptor cannot be read, when filters ask for a device's name that
// cannot be told, and where Add would fail.
Preview MakePreview(const lint::Package& package, const std::string& file,
                    const PreviewOptions& options);

}  // namespace tool

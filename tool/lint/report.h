// Finding places in a descriptor and reporting what is wrong there.
#pragma once

#include <json/value.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tool/lint/finding.h"
#include "tool/lint/package.h"
#include "tool/lint/source_text.h"

namespace tool::lint {

// A value of a parsed descriptor and its JSON pointer. Valid as long as the descriptor's value.
struct Node {
  const Json::Value* value;
  std::string pointer;

  // The member, which must be there.
  Node Member(const std::string& name) const;
  Node Element(Json::ArrayIndex index) const;
  bool Has(const std::string& name) const { return value->isObject() && value->isMember(name); }
};

// What the library takes for the elements of a list: those of a list, and the members of an object.
std::vector<Node> ElementsOf(const Node& node);

// A descriptor that parses. Where its values stand is looked up in the text.
struct ParsedDescriptor {
  std::string file;  // absolute
  SourceText source;
  Json::Value root;
};

// Collects the findings of one descriptor.
class Report {
 public:
  // Both are kept by reference.
  Report(const ParsedDescriptor& descriptor, std::vector<Finding>& findings)
      : descriptor_(descriptor), findings_(findings) {}

  void Add(const char* tag, const Node& at, std::string message,
           std::vector<std::string> languages = {});

 private:
  const ParsedDescriptor& descriptor_;
  std::vector<Finding>& findings_;
};

// A finding about a file as a whole, which stands at its beginning, or about a directory, whose
// path ends in "/" and which has no places.
Finding FileFinding(const char* tag, const std::string& file, std::string message);

// The items of a descriptor: each entry, and behind it its modules. What is no object is left out.
struct Item {
  Node node;
  Node entry;  // the entry itself for an entry
  bool is_module = false;
};
std::vector<Item> ItemsOf(const Json::Value& root);

// A text of an item that is shown or searched.
struct TextUse {
  std::string text;  // a reference or literal
  Node node;         // where it stands
};
std::optional<TextUse> TitleOf(const Item& item);
std::vector<TextUse> KeywordsOf(const Item& item);
std::vector<TextUse> TextsOf(const Item& item);  // title, description and keywords

// The texts root of an item's entry, as TextsRootOf gives it.
std::string TextsRootOf(const Package& package, const ParsedDescriptor& descriptor,
                        const Item& item);

// The id under which the item is found; empty when it has none.
std::string IdOf(const Item& item);

// The text quoted as in JSON, for messages.
std::string Quoted(const std::string& text);

// "a, b and c".
std::string Listed(const std::vector<std::string>& words);

}  // namespace tool::lint

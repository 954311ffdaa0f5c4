#include "tool/lint/report.h"

#include "appindex/utilities/json_helpers.h"
#include "tool/lint/tags.h"

namespace tool::lint {
namespace {

// A member's name as a JSON pointer writes it.
std::string Escaped(const std::string& name) {
  std::string escaped;
  for (const char c : name) {
    if (c == '~') {
      escaped += "~0";
    } else if (c == '/') {
      escaped += "~1";
    } else {
      escaped += c;
    }
  }
  return escaped;
}

void AppendEntry(std::vector<Item>& items, const Node& entry) {
  if (!entry.value->isObject()) return;
  items.push_back({entry, entry, false});
  if (!entry.Has("modules")) return;
  for (const Node& module : ElementsOf(entry.Member("modules"))) {
    if (module.value->isObject()) items.push_back({module, entry, true});
  }
}

std::string TextOf(const Node& node, const char* member) {
  const Json::Value& value = (*node.value)[member];
  return value.isString() ? value.asString() : "";
}

std::optional<TextUse> UseOf(const Node& object, const char* member) {
  if (!object.Has(member)) return std::nullopt;
  const Node node = object.Member(member);
  if (!node.value->isString() || node.value->asString().empty()) return std::nullopt;
  return TextUse{node.value->asString(), node};
}

}  // namespace

Node Node::Member(const std::string& name) const {
  return {&(*value)[name], pointer + "/" + Escaped(name)};
}

Node Node::Element(Json::ArrayIndex index) const {
  return {&(*value)[index], pointer + "/" + std::to_string(index)};
}

std::vector<Node> ElementsOf(const Node& node) {
  std::vector<Node> elements;
  if (node.value->isArray()) {
    for (Json::ArrayIndex i = 0; i < node.value->size(); ++i) elements.push_back(node.Element(i));
  } else if (node.value->isObject()) {
    for (const std::string& name : node.value->getMemberNames()) {
      elements.push_back(node.Member(name));
    }
  }
  return elements;
}

void Report::Add(const char* tag, const Node& at, std::string message,
                 std::vector<std::string> languages) {
  const auto offset = static_cast<std::size_t>(at.value->getOffsetStart());
  findings_.push_back({tag, FindTag(tag)->severity, descriptor_.file, descriptor_.source.At(offset),
                       at.pointer, std::move(message), std::move(languages)});
}

Finding FileFinding(const char* tag, const std::string& file, std::string message) {
  const bool is_dir = !file.empty() && file.back() == '/';
  const Position place = is_dir ? Position{} : Position{1, 1};
  return {tag, FindTag(tag)->severity, file, place, "", std::move(message), {}};
}

std::vector<Item> ItemsOf(const Json::Value& root) {
  std::vector<Item> items;
  const Node top{&root, ""};
  if (root.isObject()) {
    AppendEntry(items, top);
  } else if (root.isArray()) {
    for (Json::ArrayIndex i = 0; i < root.size(); ++i) AppendEntry(items, top.Element(i));
  }
  return items;
}

std::optional<TextUse> TitleOf(const Item& item) { return UseOf(item.node, "title"); }

std::vector<TextUse> KeywordsOf(const Item& item) {
  std::vector<TextUse> uses;
  if (!item.node.Has("keywords")) return uses;
  const Node keywords = item.node.Member("keywords");
  if (!keywords.value->isArray()) return uses;
  for (Json::ArrayIndex i = 0; i < keywords.value->size(); ++i) {
    const Node keyword = keywords.Element(i);
    if (keyword.value->isString()) {
      uses.push_back({keyword.value->asString(), keyword});
    } else if (const std::optional<TextUse> use = UseOf(keyword, "text")) {
      uses.push_back(*use);
    }
  }
  return uses;
}

std::vector<TextUse> TextsOf(const Item& item) {
  std::vector<TextUse> uses;
  for (const char* member : {"title", "desc"}) {
    if (const std::optional<TextUse> use = UseOf(item.node, member)) uses.push_back(*use);
  }
  for (const TextUse& use : KeywordsOf(item)) uses.push_back(use);
  return uses;
}

std::string TextsRootOf(const Package& package, const ParsedDescriptor& descriptor,
                        const Item& item) {
  const Json::Value& stringset = (*item.entry.value)["stringset"];
  if (!stringset.isString()) return TextsRootOf(package, descriptor.file, nullptr);
  const std::string name = stringset.asString();
  return TextsRootOf(package, descriptor.file, &name);
}

std::string IdOf(const Item& item) {
  std::string app = TextOf(item.entry, "app");
  if (app.empty() || !item.is_module) return app;
  const std::string params = TextOf(item.node, "params");
  return params.empty() ? "" : app + "?" + params;
}

std::string Quoted(const std::string& text) { return velkor::toString(text); }

std::string Listed(const std::vector<std::string>& words) {
  std::string text;
  for (std::size_t i = 0; i < words.size(); ++i) {
    if (i > 0) text += i + 1 == words.size() ? " and " : ", ";
    text += words[i];
  }
  return text;
}

}  // namespace tool::lint

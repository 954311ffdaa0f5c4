// A package in a temporary directory, and what the linter says about it.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "appindex/device_identity.h"
#include "tests/unit/host/temp_dir.h"
#include "tool/lint/lint.h"

namespace tool::lint {

constexpr char kGoodDescriptor[] = R"({
  "app": "Example.App",
  "title": "app:title",
  "desc": "app:desc",
  "keywords": ["app:kw", {"text": "JPEG", "weight": 2}],
  "enable": {"model": ["M1"], "platform": ["p1"]},
  "modules": [
    {"params": "tab=one", "title": "one:title", "desc": "one:desc", "disable": {"model": ["M2"]}}
  ]
})";

// A finding by its tag and its JSON pointer.
MATCHER_P2(Is, tag, pointer, "") { return arg.tag == tag && arg.pointer == pointer; }

// As long as it lives, root acts as a user whom the modes of files hold back.
class HeldBackByModes {
 public:
  HeldBackByModes() {
    if (user_ == 0 && seteuid(65534) != 0) throw std::runtime_error("cannot become another user");
  }
  ~HeldBackByModes() { EXPECT_EQ(seteuid(user_), 0); }
  HeldBackByModes(const HeldBackByModes&) = delete;
  HeldBackByModes& operator=(const HeldBackByModes&) = delete;

 private:
  const uid_t user_ = geteuid();
};

class LintTest : public ::testing::Test {
 protected:
  // A package without a finding: the descriptor above, and texts in every language.
  LintTest() {
    Describe(kGoodDescriptor);
    for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
      WriteTexts(lang, GoodTexts(lang));
    }
  }

  static std::string GoodTexts(const std::string& lang) {
    return "[app]\ntitle=\"Title " + lang + "\"\ndesc=\"A sentence in the language " + lang +
           "\"\nkw=\"word " + lang + "\"\n[one]\ntitle=\"One " + lang + "\"\ndesc=\"Of " + lang +
           "\"\n";
  }

  std::string Describe(const std::string& text) { return dir_.Write("pkg/ui/index.conf", text); }
  void WriteTexts(const std::string& lang, const std::string& text) {
    dir_.Write("pkg/ui/texts/" + lang + "/strings", text);
  }

  // The findings about the package, those of `tag` only.
  std::vector<Finding> Find(const std::string& tag = "") { return FindIn(dir_ / "pkg", tag); }
  std::vector<Finding> FindIn(const std::string& path, const std::string& tag = "") {
    std::vector<Finding> found;
    for (const Finding& finding : Lint({path}, options_).findings) {
      if (tag.empty() || finding.tag == tag) found.push_back(finding);
    }
    return found;
  }

  // The findings of `tag` about another descriptor in the same package.
  std::vector<Finding> FindWith(const std::string& descriptor, const std::string& tag) {
    Describe(descriptor);
    return Find(tag);
  }

  TempDir dir_;
  Options options_;
};

}  // namespace tool::lint

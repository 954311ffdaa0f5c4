// The ways in which people ask for an item, and how many of such queries must find it.
#pragma once

#include <unicode/locid.h>
#include <unicode/unistr.h>

#include <array>
#include <string>
#include <vector>

#include "bench/quality/items.h"

namespace bench::quality {

// What is known of a language when its queries are made.
struct Language {
  std::string code;
  icu::Locale locale;
  std::vector<icu::UnicodeString> letters;  // that its titles are written with, sorted, each once
};

Language MakeLanguage(const std::string& code, const std::vector<Item>& items);

// A query and what its writer had in mind.
struct Typed {
  icu::UnicodeString query;
  icu::UnicodeString intended;
};

// Which items the intended text fits, and so may share the first places.
enum class Fit { kTitleBegins, kTitleContains, kTitleOrKeywordsContain };

struct Kind {
  const char* name;
  int limit;  // per cent of the queries that must find the item
  Fit fit;
  std::vector<Typed> (*type)(const Item& item, const Language& language);
};

constexpr std::size_t kKindCount = 10;
extern const std::array<Kind, kKindCount> kKinds;

}  // namespace bench::quality

// What people type: the same queries for everybody who is to answer them.
#pragma once

#include <array>
#include <cstddef>
#include <string>
#include <vector>

#include "bench/speed/texts.h"

namespace bench {

constexpr std::array<const char*, 8> kQueryKinds = {
    "whole title", "title word", "prefix", "inside word", "keyword", "two words", "typo", "miss"};

struct Query {
  std::size_t lang;  // as Texts counts them
  std::size_t kind;  // as kQueryKinds counts them
  std::string text;
};

// As many queries of each kind in each language, about the items of the first `applications`.
std::vector<Query> MakeQueries(const Texts& texts, std::size_t applications);

}  // namespace bench

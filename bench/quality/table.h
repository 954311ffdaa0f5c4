// What is printed: a row per language, a column per kind of query, and the misses.
#pragma once

#include <array>
#include <map>
#include <string>
#include <vector>

#include "bench/quality/judging.h"
#include "bench/quality/kinds.h"

namespace bench::quality {

struct Cell {
  std::size_t asked = 0;
  std::size_t found = 0;
};

using Row = std::array<Cell, kKindCount>;

Row Tally(const std::vector<Question>& questions, const std::vector<Verdict>& verdicts);

// Prints the rows by language, then the least value of each column and its limit. Returns whether
// every cell keeps to its limit; a cell without queries does.
bool PrintTable(const std::map<std::string, Row>& rows);

// Prints up to `most` misses of each kind.
void PrintMisses(const std::string& lang, const std::vector<Item>& items,
                 const std::vector<Question>& questions, const std::vector<Verdict>& verdicts,
                 std::size_t most);

}  // namespace bench::quality

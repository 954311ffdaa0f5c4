// The same searches answered by SQLite's full-text search over trigrams.
#pragma once

#include <string>
#include <vector>

#include "bench/speed/answers.h"
#include "bench/speed/queries.h"
#include "bench/speed/texts.h"

namespace bench {

// Fills a database in the file `path` with the documents of all applications and asks each query
// twice, measuring the second time. In a process of its own.
Answers SearchWithSqlite(const Texts& texts, std::size_t applications,
                         const std::vector<Query>& queries, const std::string& path);

}  // namespace bench

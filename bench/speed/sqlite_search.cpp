#include "bench/speed/sqlite_search.h"

#include <sqlite3.h>

#include <map>
#include <memory>
#include <sstream>
#include <stdexcept>

#include "bench/measure.h"
#include "bench/speed/load.h"
#include "bench/speed/process.h"

namespace bench {
namespace {

// The shortest text that trigrams can find; shorter ones take a look at every row.
constexpr std::size_t kTrigram = 3;
constexpr const char* kColumns[] = {"id", "owner", "title", "desc", "keywords"};

class Statement {
 public:
  Statement(sqlite3* database, const std::string& sql) {
    if (sqlite3_prepare_v2(database, sql.c_str(), -1, &statement_, nullptr) != SQLITE_OK) {
      throw std::runtime_error(sql + ": " + sqlite3_errmsg(database));
    }
  }
  ~Statement() { sqlite3_finalize(statement_); }
  Statement(const Statement&) = delete;
  Statement& operator=(const Statement&) = delete;

  void Bind(int place, const std::string& text) {
    sqlite3_bind_text(statement_, place, text.c_str(), static_cast<int>(text.size()),
                      SQLITE_TRANSIENT);
  }

  // Runs to the end, fetching the columns of each row; returns how many rows there were.
  std::size_t Run() {
    std::size_t rows = 0;
    int state = SQLITE_ROW;
    while ((state = sqlite3_step(statement_)) == SQLITE_ROW) {
      for (int i = 0; i < sqlite3_column_count(statement_); ++i) {
        sqlite3_column_text(statement_, i);
      }
      ++rows;
    }
    if (state != SQLITE_DONE) throw std::runtime_error(sqlite3_errstr(state));
    sqlite3_reset(statement_);
    return rows;
  }

 private:
  sqlite3_stmt* statement_ = nullptr;
};

class Database {
 public:
  explicit Database(const std::string& path) {
    if (sqlite3_open(path.c_str(), &database_) != SQLITE_OK) {
      throw std::runtime_error("cannot open " + path);
    }
  }
  ~Database() {
    prepared_.clear();
    sqlite3_close(database_);
  }
  Database(const Database&) = delete;
  Database& operator=(const Database&) = delete;

  void Execute(const std::string& sql) {
    if (sqlite3_exec(database_, sql.c_str(), nullptr, nullptr, nullptr) != SQLITE_OK) {
      throw std::runtime_error(sql + ": " + sqlite3_errmsg(database_));
    }
  }

  // Each statement is prepared once and kept.
  Statement& Prepared(const std::string& sql) {
    std::unique_ptr<Statement>& statement = prepared_[sql];
    if (!statement) statement = std::make_unique<Statement>(database_, sql);
    return *statement;
  }

 private:
  sqlite3* database_ = nullptr;
  std::map<std::string, std::unique_ptr<Statement>> prepared_;
};

// A table for each language: with one for all, each query would look at all languages' rows.
void Fill(Database& database, const Texts& texts, std::size_t applications) {
  database.Execute("PRAGMA cache_size = -524288");  // all of it in memory
  database.Execute("PRAGMA synchronous = OFF");
  database.Execute("BEGIN");
  for (const std::string& lang : texts.Langs()) {
    database.Execute("CREATE VIRTUAL TABLE " + lang +
                     " USING fts5(id UNINDEXED, owner UNINDEXED, title, desc, keywords, "
                     "tokenize = 'trigram')");
  }
  ForEachDocument(texts, 0, applications, [&](std::size_t lang, const Json::Value& document) {
    Statement& insert =
        database.Prepared("INSERT INTO " + texts.Langs()[lang] + " VALUES (?, ?, ?, ?, ?)");
    int place = 0;
    for (const char* column : kColumns) insert.Bind(++place, document[column].asString());
    insert.Run();
  });
  for (const std::string& lang : texts.Langs()) {
    database.Execute("INSERT INTO " + lang + "(" + lang + ") VALUES ('optimize')");
  }
  database.Execute("COMMIT");
}

// A query in SQLite's words: all its words must be found, each anywhere in a text. Where only short
// words are asked for there is no rank to order by: SQLite may stop at the first 20 rows, although
// that is less than a search box needs.
struct Search {
  std::string sql;
  std::vector<std::string> bound;
};

std::string Quoted(const std::string& text) {
  std::string quoted = "\"";
  for (const char c : text) quoted += c == '"' ? std::string("\"\"") : std::string(1, c);
  return quoted + "\"";
}

Search Translate(const std::string& table, const std::string& text) {
  std::string match;
  std::string conditions;
  std::vector<std::string> likes;
  std::istringstream words(text);
  for (std::string word; words >> word;) {
    if (Characters(word).size() >= kTrigram) {
      match += (match.empty() ? "" : " AND ") + Quoted(word);
      continue;
    }
    if (!conditions.empty()) conditions += " AND ";
    conditions += "(title LIKE ? OR desc LIKE ? OR keywords LIKE ?)";
    likes.insert(likes.end(), 3, "%" + word + "%");
  }
  Search search;
  search.sql = "SELECT id, owner, title, desc, rank FROM " + table + " WHERE ";
  if (!match.empty()) {
    search.sql += table + " MATCH ?" + (conditions.empty() ? "" : " AND ");
    search.bound.push_back(match);
  }
  search.bound.insert(search.bound.end(), likes.begin(), likes.end());
  search.sql += conditions + (match.empty() ? "" : " ORDER BY rank") + " LIMIT 20";
  return search;
}

std::size_t Ask(Database& database, const Texts& texts, const Query& query) {
  const Search search = Translate(texts.Langs()[query.lang], query.text);
  Statement& statement = database.Prepared(search.sql);
  int place = 0;
  for (const std::string& text : search.bound) statement.Bind(++place, text);
  return statement.Run();
}

}  // namespace

Answers SearchWithSqlite(const Texts& texts, std::size_t applications,
                         const std::vector<Query>& queries, const std::string& path) {
  const Json::Value result = InOwnProcess([&] {
    Database database(path);
    Fill(database, texts, applications);
    for (const Query& query : queries) Ask(database, texts, query);
    Json::Value measured(Json::objectValue);
    for (const Query& query : queries) {
      std::size_t hits = 0;
      measured["seconds"].append(SecondsOf([&] { hits = Ask(database, texts, query); }));
      measured["hits"].append(Json::UInt64(hits));
    }
    return measured;
  });
  Answers answers;
  for (const Json::Value& seconds : result["seconds"]) {
    answers.seconds.push_back(seconds.asDouble());
  }
  for (const Json::Value& hits : result["hits"]) answers.hits.push_back(hits.asUInt64());
  return answers;
}

}  // namespace bench

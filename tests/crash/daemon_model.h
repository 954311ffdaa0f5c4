// What the search daemon's answers promise: what may be found in its indexes by the next daemon.
#pragma once

#include <json/value.h>

#include <map>
#include <optional>
#include <set>
#include <string>

namespace test {

// Of each answer it says what that makes certain. What is not certain stays open, and several
// things may then be true of an index.
class DaemonModel {
 public:
  using Documents = std::set<std::string>;  // by id

  // In place of a code: the request was sent, and nothing is known of what became of it.
  static constexpr int kNoReply = -1;
  // What Allows takes for an index that there is not.
  static constexpr char kMissing[] = "601";

  // `indexes` are all that there may ever be, by id, as they are on disk now; none: missing.
  explicit DaemonModel(const std::map<std::string, std::optional<Documents>>& indexes);

  // A request and the code of its reply.
  void Answered(const Json::Value& request, int code);
  // The daemon had time to save which indexes there are. If it has not come to the end with that,
  // they may be saved or not.
  void WasIdle(bool to_the_end);

  // Whether a daemon that starts now may find `found` in an index: ids with blanks between them, or
  // kMissing.
  bool Allows(const std::string& index, const std::string& found) const;
  // All that it may find there, for a failure's text.
  std::string Text(const std::string& index) const;

 private:
  // None: there is no such index.
  using Content = std::optional<Documents>;

  // One of the things that may be true of an index.
  struct Case {
    Content on_disk;    // what the next daemon finds
    Content committed;  // what this one falls back to when it loses what is not committed
    Content current;    // the same with what is not committed
    bool operator<(const Case& other) const;
  };
  using Cases = std::set<Case>;

  static Cases Outcomes(const Json::Value& request, const Case& before, int code);
  static Cases OutcomesOfCreation(const Case& before, int code);
  static Cases OutcomesOfCommit(const Case& before, int code);
  static Case Saved(Case before);
  static std::string Text(const Content& content);

  std::map<std::string, Cases> indexes_;
};

}  // namespace test

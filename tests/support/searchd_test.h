// The search daemon in a device root of a test's own, asked and handled from outside the root.
#pragma once

#include <gtest/gtest.h>
#include <json/value.h>
#include <sys/types.h>

#include <filesystem>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "tests/support/searchd_process.h"
#include "tests/support/searchd_requests.h"

namespace test {

std::string ReadFileOf(const std::filesystem::path& path);
void WriteFileOf(const std::filesystem::path& path, const std::string& text);

class SearchdTest : public testing::Test {
 protected:
  void SetUp() override;
  void TearDown() override;

  std::string Socket() const { return root_ / "var/run/tovoelasticd.sock"; }
  std::string RegistryFile() const { return root_ / "var/lib/tovoelasticd/indexes.json"; }
  // The file `path` of the root.
  std::filesystem::path Outside(const std::string& path) const { return root_ / path.substr(1); }
  // A file in the directory of a language's index.
  std::filesystem::path IndexFile(const std::string& language, const std::string& name = "") const {
    return Outside(kIndexes + language) / name;
  }

  // Starts the daemon and waits until it is ready or has ended.
  std::unique_ptr<SearchdProcess> Launch(const std::vector<std::string>& more = {},
                                         const std::function<void()>& prepare = nullptr) const;
  // Fails the test when it does not become ready.
  void Start(const std::vector<std::string>& more = {});
  void Restart(int signal);
  // Whether a daemon in the background can enter its root. Who is not root does so through a user
  // namespace, which only a process of one thread may enter; ThreadSanitizer gives a forked one a
  // second.
  static bool MayGoToTheBackground();
  // Ends a daemon that has gone to the background, and waits for its end.
  void StopBackground() const;

  // One exchange; an empty text when there is no reply.
  std::string AskText(const std::string& text) const;
  Json::Value Ask(const Json::Value& request) const;
  // The reply to another user's request.
  Json::Value AskAs(uid_t user, const Json::Value& request) const;

  // Each fails the test when it does not succeed. The index of `language` is "appindex_LANGUAGE".
  void Create(const std::string& language) const;
  void Delete(const std::string& language) const;
  void Upsert(const std::string& language, const Json::Value& document) const;
  void Commit(const std::string& language) const;
  // Creates an index with one document, "files", that "file" finds, and commits it.
  void Fill(const std::string& language) const;

  // Creates index `id` with documents that "large" finds, each with a text of so many bytes that is
  // returned with it, and commits them.
  void FillWithLargeDocuments(const std::string& id, int documents, std::size_t bytes) const;

  // The ids of what a search finds, in its order, or the code of its failure.
  std::string Find(const std::string& language, const std::string& query) const;

  std::filesystem::path root_;
  std::unique_ptr<SearchdProcess> daemon_;
};

}  // namespace test

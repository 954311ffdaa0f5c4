#include "bench/speed/daemon_run.h"

#include <appindex/elastic_control.h>
#include <appindex/utilities/json_helpers.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <thread>

#include "appindex/elastic_control_internal.h"
#include "bench/measure.h"
#include "bench/speed/daemon.h"
#include "bench/speed/load.h"

namespace bench {
namespace {

namespace elastic = velkor::appindex::elastic;

constexpr std::size_t kRewrittenApplications = 20;
constexpr std::size_t kEmptySearches = 501;

double BytesOnDisk(const Texts& texts) {
  double bytes = 0;
  for (const std::string& lang : texts.Langs()) {
    for (const auto& file : std::filesystem::directory_iterator(elastic::kIndexDbDir + lang)) {
      bytes += static_cast<double>(file.file_size());
    }
  }
  return bytes;
}

std::vector<std::string> UpsertRequests(const Texts& texts, std::size_t begin, std::size_t end) {
  std::vector<std::string> requests;
  ForEachDocument(texts, begin, end, [&](std::size_t lang, const Json::Value& document) {
    requests.push_back(UpsertRequest(texts.Langs()[lang], document));
  });
  return requests;
}

void CommitAll(const Texts& texts) {
  for (const std::string& lang : texts.Langs()) elastic::IndexCommit(lang);
}

// Writes one application again and commits it, language by language, as its installation does.
double SecondsOfCommit(const Texts& texts, std::size_t application) {
  const std::vector<std::string> requests = UpsertRequests(texts, application, application + 1);
  Answers commits;
  for (std::size_t lang = 0; lang < texts.Langs().size(); ++lang) {
    for (std::size_t item = 0; item < kItemsPerApplication; ++item) {
      Ask(requests[lang * kItemsPerApplication + item]);
    }
    commits.seconds.push_back(SecondsOf([&] { elastic::IndexCommit(texts.Langs()[lang]); }));
  }
  return commits.SecondsWithin(0.5);
}

// Writes until it goes out of scope.
class RestlessWriter {
 public:
  RestlessWriter(const Texts& texts, std::size_t applications)
      : requests_(Requests(texts, std::min(applications, kRewrittenApplications))),
        thread_([this] { Run(); }) {}
  ~RestlessWriter() {
    stop_ = true;
    thread_.join();
  }
  RestlessWriter(const RestlessWriter&) = delete;
  RestlessWriter& operator=(const RestlessWriter&) = delete;

  // Stops being true when the daemon refuses something.
  bool IsWriting() const { return !failed_; }
  double Written() const { return static_cast<double>(written_); }

 private:
  static std::vector<std::string> Requests(const Texts& texts, std::size_t applications) {
    std::vector<std::string> requests;
    std::size_t count = 0;
    ForEachDocument(texts, 0, applications, [&](std::size_t lang, const Json::Value& document) {
      requests.push_back(UpsertRequest(texts.Langs()[lang], document));
      const bool last = ++count % kItemsPerApplication == 0;
      if (last) requests.push_back(CommitRequest(texts.Langs()[lang]));
    });
    return requests;
  }

  void Run() {
    try {
      for (std::size_t i = 0; !stop_; i = (i + 1) % requests_.size()) {
        Ask(requests_[i]);
        ++written_;
      }
    } catch (const std::exception&) {
      failed_ = true;
    }
  }

  const std::vector<std::string> requests_;
  std::atomic<bool> stop_ = false;
  std::atomic<bool> failed_ = false;
  std::atomic<std::size_t> written_ = 0;
  std::thread thread_;
};

Answers AskAll(const Texts& texts, const std::vector<Query>& queries) {
  Answers answers;
  for (const Query& query : queries) {
    const std::string request = SearchRequest(texts.Langs()[query.lang], query.text);
    Json::Value reply;
    answers.seconds.push_back(SecondsOf([&] { reply = Ask(request); }));
    answers.hits.push_back(reply["hits"].size());
  }
  return answers;
}

}  // namespace

void CreateIndexes(const Texts& texts) {
  for (const std::string& lang : texts.Langs()) elastic::AppIndexCreate(lang);
}

Costs Grow(const Texts& texts, std::size_t begin, std::size_t end,
           const std::vector<Query>& queries) {
  Costs costs;
  costs.applications = end;
  {
    const std::vector<std::string> requests = UpsertRequests(texts, begin, end);
    costs.written = requests.size();
    costs.fill_seconds = SecondsOf([&] {
      SendAll(requests);
      CommitAll(texts);
    });
  }
  const std::size_t documents = end * kItemsPerApplication * texts.Langs().size();
  costs.bytes_per_document = BytesOnDisk(texts) / static_cast<double>(documents);
  costs.searches = SearchDaemon(texts, queries);
  costs.commit_seconds = SecondsOfCommit(texts, begin);
  return costs;
}

Answers SearchDaemon(const Texts& texts, const std::vector<Query>& queries) {
  AskAll(texts, queries);
  return AskAll(texts, queries);
}

BusySearches SearchBusyDaemon(const Texts& texts, std::size_t applications,
                              const std::vector<Query>& queries) {
  BusySearches busy;
  const RestlessWriter writer(texts, applications);
  const double seconds = SecondsOf([&] { busy.searches = AskAll(texts, queries); });
  busy.writes_per_second = writer.Written() / seconds;
  if (!writer.IsWriting()) throw std::runtime_error("the daemon refused a write");
  return busy;
}

double SecondsOfEmptySearch(const Texts& texts) {
  Answers answers;
  const std::string request = SearchRequest(texts.Langs().front(), "");
  for (std::size_t i = 0; i < kEmptySearches; ++i) {
    answers.seconds.push_back(SecondsOf([&] { Ask(request); }));
  }
  return answers.SecondsWithin(0.5);
}

}  // namespace bench

#include "bench/quality/judging.h"

#include <algorithm>
#include <atomic>
#include <future>
#include <map>
#include <set>
#include <utility>

#include "appindex/elastic_control.h"
#include "appindex/elastic_control_internal.h"
#include "bench/quality/kinds.h"
#include "bench/quality/text.h"

namespace bench::quality {
namespace {

constexpr std::size_t kFirstPlaces = 3;
constexpr int kMostHits = 1000;
constexpr std::size_t kHitsKept = 5;
constexpr unsigned kThreads = 2;

// The forms in which a text is compared: two texts fit when they do in one of them. In Turkish,
// both ways of folding I and i are right.
std::vector<icu::UnicodeString> Forms(const icu::UnicodeString& text, const std::string& lang) {
  std::vector<icu::UnicodeString> forms = {Folded(text, false)};
  if (lang == "trk") forms.push_back(Folded(text, true));
  return forms;
}

// How many items a text fits.
class Fitting {
 public:
  Fitting(std::string lang, const std::vector<Item>& items) : lang_(std::move(lang)) {
    for (const Item& item : items) {
      titles_.push_back(Forms(FromUtf8(item.title), lang_));
      const std::string both = item.title + "\n" + item.document["keywords"].asString();
      texts_.push_back(Forms(FromUtf8(both), lang_));
    }
  }

  std::size_t Count(const icu::UnicodeString& intended, Fit fit) const {
    const Texts& texts = fit == Fit::kTitleOrKeywordsContain ? texts_ : titles_;
    const std::vector<icu::UnicodeString> wanted = Forms(intended, lang_);
    return static_cast<std::size_t>(
        std::count_if(texts.begin(), texts.end(), [&](const auto& forms) {
          for (std::size_t i = 0; i < forms.size(); ++i) {
            const int32_t at = forms[i].indexOf(wanted[i]);
            if (at == 0 || (at > 0 && fit != Fit::kTitleBegins)) return true;
          }
          return false;
        }));
  }

 private:
  using Texts = std::vector<std::vector<icu::UnicodeString>>;

  std::string lang_;
  Texts titles_;
  Texts texts_;
};

std::vector<Hit> Search(const std::string& lang, const std::string& query) {
  Json::Value request;
  request["command"] = "search";
  request["data"]["id"] = velkor::appindex::elastic::GetAppIndexID(lang);
  request["data"]["query"] = query;
  request["data"]["limit"] = kMostHits;
  Json::Value reply;
  velkor::appindex::elastic::SendRequestImpl(reply, request);
  std::vector<Hit> hits;
  for (const Json::Value& hit : reply["hits"]) {
    hits.push_back({hit["id"].asString(), hit["title"].asString(), hit["score"].asDouble()});
  }
  return hits;
}

Verdict Judge(const std::vector<Hit>& hits, const std::string& wanted, std::size_t allowed) {
  Verdict verdict;
  const auto own =
      std::find_if(hits.begin(), hits.end(), [&](const Hit& hit) { return hit.id == wanted; });
  if (own != hits.end()) {
    verdict.rank = static_cast<std::size_t>(std::count_if(
        hits.begin(), hits.end(), [&](const Hit& hit) { return hit.score >= own->score; }));
    verdict.found = verdict.rank <= allowed;
  }
  if (!verdict.found) {
    verdict.first_hits.assign(
        hits.begin(), hits.begin() + static_cast<std::ptrdiff_t>(std::min(hits.size(), kHitsKept)));
  }
  return verdict;
}

}  // namespace

std::vector<Question> MakeQuestions(const std::string& lang, const std::vector<Item>& items,
                                    std::size_t only) {
  const Language language = MakeLanguage(lang, items);
  const Fitting fitting(lang, items);
  std::vector<Question> questions;
  for (std::size_t kind = 0; kind < kKindCount; ++kind) {
    if (only != kKindCount && only != kind) continue;
    for (std::size_t i = 0; i < items.size(); ++i) {
      std::set<icu::UnicodeString> asked;
      for (const Typed& typed : kKinds[kind].type(items[i], language)) {
        if (!HasLetterOrDigit(typed.query) || !asked.insert(typed.query).second) continue;
        const std::size_t fits = fitting.Count(typed.intended, kKinds[kind].fit);
        questions.push_back({kind, i, ToUtf8(typed.query), std::max(kFirstPlaces, fits)});
      }
    }
  }
  return questions;
}

std::vector<Verdict> Ask(const std::string& lang, const std::vector<Item>& items,
                         const std::vector<Question>& questions) {
  std::map<std::string, std::vector<std::size_t>> by_query;
  for (std::size_t i = 0; i < questions.size(); ++i) by_query[questions[i].query].push_back(i);
  const std::vector<std::pair<std::string, std::vector<std::size_t>>> work(by_query.begin(),
                                                                           by_query.end());
  std::vector<Verdict> verdicts(questions.size());
  std::atomic<std::size_t> next{0};
  const auto ask = [&] {
    for (std::size_t i = next++; i < work.size(); i = next++) {
      const std::vector<Hit> hits = Search(lang, work[i].first);
      for (const std::size_t q : work[i].second) {
        verdicts[q] = Judge(hits, items[questions[q].item].id, questions[q].allowed);
      }
    }
  };
  std::vector<std::future<void>> threads;
  for (unsigned i = 0; i < kThreads; ++i) threads.push_back(std::async(std::launch::async, ask));
  for (std::future<void>& thread : threads) thread.get();
  return verdicts;
}

}  // namespace bench::quality

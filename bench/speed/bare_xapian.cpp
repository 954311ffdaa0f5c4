#include "bench/speed/bare_xapian.h"

#include <unistd.h>
#include <xapian.h>

#include <filesystem>
#include <memory>
#include <string>

#include "appindex/elastic_control_internal.h"
#include "bench/measure.h"
#include "bench/speed/load.h"
#include "host/searchd/analyzer.h"
#include "host/searchd/document.h"
#include "host/searchd/language.h"
#include "host/searchd/terms.h"

namespace bench {
namespace {

struct BuiltDocument {
  std::size_t lang;
  std::string key;
  Xapian::Document document;
};

// Makes documents as the daemon makes them.
class Builder {
 public:
  explicit Builder(const Texts& texts)
      : texts_(texts),
        mapping_(searchd::Mapping::Parse(velkor::appindex::elastic::GetAppIndexMappings())) {
    for (const std::string& lang : texts.Langs()) {
      analyzers_.push_back(
          std::make_unique<searchd::Analyzer>(searchd::LanguageOfIndex("appindex_" + lang)));
    }
  }

  std::vector<BuiltDocument> OneApplication(std::size_t application) {
    std::vector<BuiltDocument> built;
    ForEachDocument(
        texts_, application, application + 1, [&](std::size_t lang, const Json::Value& document) {
          const std::string id = document["id"].asString();
          built.push_back({lang, searchd::KeyTerm(id),
                           searchd::BuildDocument(mapping_, *analyzers_[lang], id, document)});
        });
    return built;
  }

 private:
  const Texts& texts_;
  searchd::Mapping mapping_;
  std::vector<std::unique_ptr<searchd::Analyzer>> analyzers_;
};

class Writer {
 public:
  Writer(const Texts& texts, const std::string& dir) {
    for (const std::string& lang : texts.Langs()) {
      paths_.push_back(dir + "/" + lang);
      std::filesystem::create_directories(paths_.back());
      databases_.emplace_back(paths_.back(), Xapian::DB_CREATE_OR_OPEN | Xapian::DB_BACKEND_GLASS);
    }
  }

  void Replace(const std::vector<BuiltDocument>& built) {
    for (const BuiltDocument& one : built) {
      databases_[one.lang].replace_document(one.key, one.document);
    }
  }

  void Commit() {
    for (Xapian::WritableDatabase& database : databases_) database.commit();
  }

  std::vector<Xapian::Database> OpenForReading() const { return {paths_.begin(), paths_.end()}; }

 private:
  std::vector<std::string> paths_;
  std::vector<Xapian::WritableDatabase> databases_;
};

double SecondsOfPortion(Builder& builder, Writer& writer, std::size_t begin, std::size_t end) {
  double seconds = 0;
  for (std::size_t application = begin; application < end; ++application) {
    const std::vector<BuiltDocument> built = builder.OneApplication(application);
    seconds += SecondsOf([&] { writer.Replace(built); });
  }
  return seconds + SecondsOf([&] { writer.Commit(); });
}

}  // namespace

BareXapian WriteWithBareXapian(const ProcessList& processes, const Texts& texts,
                               const std::vector<std::size_t>& sizes, const std::string& dir) {
  const Json::Value result = InOwnProcess([&] {
    // Making documents takes memory that is not Xapian's: it is in use before the first look.
    Builder builder(texts);
    builder.OneApplication(0);
    const Memory before = processes.MemoryOf(getpid());

    Json::Value measured(Json::objectValue);
    Writer writer(texts, dir);
    std::size_t written = 0;
    for (const std::size_t size : sizes) {
      measured["seconds"].append(SecondsOfPortion(builder, writer, written, size));
      written = size;
    }
    const std::vector<Xapian::Database> readers = writer.OpenForReading();
    const Memory after = processes.MemoryOf(getpid());
    measured["megabytes"] = after.own - before.own;
    measured["peak"] = after.peak - before.Resident();
    return measured;
  });

  BareXapian bare;
  for (const Json::Value& seconds : result["seconds"]) bare.seconds.push_back(seconds.asDouble());
  bare.megabytes = result["megabytes"].asDouble();
  bare.peak_megabytes = result["peak"].asDouble();
  return bare;
}

}  // namespace bench

// The library sends and writes the same bytes in the locale of whichever language the program has
// chosen. The locales are made by the build, in LOCALES.
#include <gtest/gtest.h>
#include <json/writer.h>  // prints values in failure messages
#include <langinfo.h>

#include <cctype>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cwctype>
#include <filesystem>
#include <functional>
#include <locale>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "appindex/index_mgr.h"
#include "appindex/utilities/json_helpers.h"
#include "tests/reliability/callers_process.h"

namespace {

namespace fs = std::filesystem;

// A locale, and what is unlike in it.
struct Language {
  const char* name;
  const char* locale;
  bool (*is_spoken)();
};

void PrintTo(const Language& language, std::ostream* out) { *out << language.name; }

const Language kLanguages[] = {
    {"Turkish", "tr_TR.UTF-8",
     [] { return std::towlower(L'I') == L'\u0131' && std::towupper(L'i') == L'\u0130'; }},
    {"German", "de_DE.UTF-8",
     [] {
       char text[8];
       std::snprintf(text, sizeof(text), "%.1f", 2.5);
       return std::string(text) == "2,5";
     }},
    {"RussianOfEightBits", "ru_RU.KOI8-R",
     [] { return std::string(nl_langinfo(CODESET)) == "KOI8-R" && std::tolower(0xE1) == 0xC1; }},
};

class CallersLanguage : public test::CallersProcess, public testing::WithParamInterface<Language> {
 protected:
  struct Outcome {
    std::vector<Json::Value> requests;
    std::string record;
  };

  // Before the device root is entered, where there are no locales.
  static void SetUpTestSuite() {
    setenv("LOCPATH", LOCALES, 1);
    for (const Language& language : kLanguages)
      loaded_[language.name] = std::locale(language.locale);
  }

  CallersLanguage() {
    test::WriteFile(kConf, R"({"app":"TITLE.Iı","title":"app:TITLE","desc":"app:desc",
        "keywords":[{"text":"IŞIK ıi","weight":3},"ÄÖÜ"],"enable":{"model":["M420_plus"]}})");
    WriteText("enu", "INTERNAL FILES, 2.5 I/i");
    WriteText("ger", "Größe ÄÖÜ 1.234,5");
    WriteText("rus", "ФАЙЛЫ И папки");
    WriteText("trk", kTurkishTitle);
  }

  // What is sent and recorded by a process that knows nothing of the library's work before, and
  // chooses its locale first.
  Outcome Do(const std::function<bool()>& choose_locale) {
    model_.Set({});
    fs::remove(test::kRecord);
    const std::size_t before = daemon_.Requests().size();
    EXPECT_EQ(test::StatusOf([&] { return choose_locale() ? Work() : kNoLocale; }), kDone);
    Outcome outcome{daemon_.Requests(), test::ReadFile(test::kRecord)};
    outcome.requests.erase(outcome.requests.begin(),
                           outcome.requests.begin() + static_cast<std::ptrdiff_t>(before));
    return outcome;
  }

  static void ExpectSame(const Outcome& outcome, const Outcome& usual) {
    EXPECT_EQ(outcome.record, usual.record);
    ASSERT_EQ(outcome.requests.size(), usual.requests.size());
    for (std::size_t i = 0; i < usual.requests.size(); ++i) {
      ASSERT_EQ(outcome.requests[i], usual.requests[i]);
    }
  }

  static bool ReadsFractions() {
    Json::Value value;
    return velkor::fromString(value, "[2.5,1234567.5,1e-3]") &&
           velkor::toString(value) == "[2.5,1234567.5,0.001]";
  }

  static constexpr char kTurkishTitle[] = "Işık İÇİN ılık";
  static inline std::map<std::string, std::locale> loaded_;

 private:
  enum Status { kDone, kNoLocale, kFault };

  static void WriteText(const std::string& lang, const std::string& title) {
    test::WriteFile("/var/packages/Größe I/target/ui/texts/" + lang + "/strings",
                    "[app]\nTITLE=\"" + title + "\"\ndesc=\"İıŞş\"\n");
  }

  static int Work() {
    const std::string system = test::ReadFile(kSystem);
    if (!Fault(test::AllCalls()).empty()) return kFault;
    velkor::appindex::Add(kConf, true);
    test::Enqueue(test::Request(2, kConf));
    test::Enqueue("\xE1\xFF{\"op\":1}");
    test::Enqueue(R"({"op":1,"path":"/var/packages/Gr\u00f6\u00dfe I/target/ui/index.conf"})");
    velkor::appindex::ProcessQueue();
    test::WriteFile(kSystem, "ID=INDIGO\nVERSION_ID=\"7.25\"\nBUILD_ID=\"İı\"\n");
    velkor::appindex::Reindex();
    test::WriteFile(kSystem, system);
    return kDone;
  }

  static constexpr char kSystem[] = "/etc/os-release";
  static constexpr char kConf[] = "/var/packages/Größe I/target/ui/index.conf";
};

TEST_P(CallersLanguage, ChangesNothing) {
  const Outcome usual = Do([] { return !GetParam().is_spoken() && ReadsFractions(); });
  EXPECT_EQ(usual.record, "{\"indexed_version\":\"INDIGO-7.25-İı\"}\n");
  std::set<std::string> titles;
  for (const Json::Value& request : usual.requests) {
    titles.insert(request["data"]["data"]["title"].asString());
  }
  EXPECT_EQ(titles.count(kTurkishTitle), 1U);

  ExpectSame(Do([] {
               return std::setlocale(LC_ALL, GetParam().locale) != nullptr &&
                      GetParam().is_spoken() && ReadsFractions();
             }),
             usual);
  // Of C++ as well. The JSON library then reads fractions as that language writes them.
  ExpectSame(Do([] {
               std::locale::global(loaded_[GetParam().name]);
               return GetParam().is_spoken();
             }),
             usual);
}

INSTANTIATE_TEST_SUITE_P(Of, CallersLanguage, testing::ValuesIn(kLanguages),
                         [](const auto& language) { return std::string(language.param.name); });

}  // namespace

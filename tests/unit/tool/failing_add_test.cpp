// Every way in which a descriptor, or its texts, make Add fail: the real library and the real
// search daemon fail, the trial of `appindex status` says so beforehand, and the linter has an
// error.
#include <gmock/gmock.h>
#include <json/value.h>

#include <algorithm>
#include <exception>
#include <map>

#include "appindex/elastic_control.h"
#include "appindex/index_mgr.h"
#include "appindex/index_queue_internal.h"
#include "tests/integration/real_device.h"
#include "tool/lint/lint.h"
#include "tool/refusal.h"
#include "tool/trial.h"

namespace tool {
namespace {

using velkor::Error;
using velkor::appindex::Add;
using velkor::appindex::kAdd;

constexpr std::size_t kMiB = std::size_t{1024} * 1024;
constexpr std::size_t kLongestText = kMiB - 1024;  // that fits into a file of texts, among others
constexpr int kNoError = -1;

struct Way {
  const char* name;
  std::string descriptor;
  int code;                 // of the Error; 0: another exception
  std::string german = "";  // further texts, in section "x"
};

std::string Entry(const std::string& members) {
  return R"({"app":"Bad","title":"t",)" + members + "}";
}

std::string Long(std::size_t bytes) { return "\"" + std::string(bytes, 'x') + "\""; }

std::vector<Way> WaysOfTypes() {
  const std::string module = R"("modules":[{"params":"p",)";
  return {
      {"no app", R"({"title":"t"})", 120},
      {"app null", R"({"app":null,"title":"t"})", 120},
      {"app a number", R"({"app":7,"title":"t"})", 120},
      {"app true", R"({"app":true,"title":"t"})", 120},
      {"app a list", R"({"app":[],"title":"t"})", 120},
      {"app an object", R"({"app":{},"title":"t"})", 120},
      {"app of the second entry", R"([{"app":"Bad","title":"t"},{"title":"t"}])", 120},
      {"title a list", R"({"app":"Bad","title":[]})", 0},
      {"title an object", R"({"app":"Bad","title":{"a":1}})", 0},
      {"desc a list", Entry(R"("desc":["d"])"), 0},
      {"desc an object", Entry(R"("desc":{})"), 0},
      {"keyword a list", Entry(R"("keywords":["k",["l"]])"), 0},
      {"keywords an object with a list", Entry(R"("keywords":{"a":[]})"), 0},
      {"title of a module", Entry(module + R"("title":[]}])"), 0},
      {"desc of a module", Entry(module + R"("title":"m","desc":{}}])"), 0},
      {"keyword of a module", Entry(module + R"("title":"m","keywords":[[]]}])"), 0},
      {"modules an object", Entry(R"("modules":{"a":{"params":"p","title":[]}})"), 0},
  };
}

std::vector<Way> WaysOfTexts() {
  return {
      {"NUL in app", R"({"app":"Bad\u0000","title":"t"})", 603},
      {"NUL in params", Entry(R"("modules":[{"params":"\u0000","title":"m"}])"), 603},
      {"NUL in title", R"({"app":"Bad","title":"\u0000"})", 603},
      {"NUL in desc", Entry(R"("desc":"a\u0000b")"), 603},
      {"NUL in a keyword", Entry(R"("keywords":["k\u0000"])"), 603},
      {"NUL in a keyword object", Entry(R"("keywords":[{"text":"k\u0000","weight":2}])"), 603},
      {"NUL in a reference", Entry(R"("desc":"no:\u0000")"), 603},
      {"NUL in a text", Entry(R"("desc":"x:nul")"), 603, std::string("nul=\"a\0b\"\n", 10)},
      {"long app", R"({"app":)" + Long(4097) + R"(,"title":"t"})", 603},
      {"long params", Entry(R"("modules":[{"title":"m","params":)" + Long(4093) + "}]"), 603},
      {"long title", R"({"app":"Bad","title":)" + Long(kMiB + 1) + "}", 603},
      {"long desc", Entry(R"("desc":)" + Long(kMiB + 1)), 603},
      {"long keyword", Entry(R"("keywords":[)" + Long(kMiB) + "]"), 603},
      {"heavy keyword", Entry(R"("keywords":[{"weight":9,"text":)" + Long(kMiB / 8) + "}]"), 603},
      {"heavy text", Entry(R"("keywords":[{"weight":9,"text":"x:long"}])"), 603,
       "long=" + Long(kMiB / 2) + "\n"},
      {"bytes that grow", Entry("\"desc\":\"" + std::string(kMiB / 2, '\xFF') + "\""), 603},
      {"more than a message", R"({"app":"Bad","desc":"x:low","title":"x:low"})", 913,
       "low=\"" + std::string(kLongestText, '\x01') + "\"\n"},
  };
}

class FailingAdd : public test::RealDeviceTest {
 protected:
  FailingAdd() { velkor::appindex::Reindex(); }

  // Installs it under a name of its own, since the library keeps the texts of a path.
  std::string InstallWay(const Way& way) {
    const std::string package = "/var/packages/Bad" + std::to_string(++installed_);
    for (const char* lang : {"enu", "ger"}) {
      const bool further = std::string(lang) == "ger";
      test::WriteFile(package + "/texts/" + lang + "/strings",
                      "[x]\nnul=\"n\"\nlong=\"l\"\nlow=\"o\"\n" + (further ? way.german : ""));
    }
    test::WriteFile(package + "/index.conf", way.descriptor);
    return package + "/index.conf";
  }

  // The code of the Error that adding ends in, 0 for another exception.
  static int CodeOfAdd(const std::string& conf_path) {
    try {
      Add(conf_path, true);
    } catch (const Error& error) {
      return error.code;
    } catch (const Json::Exception&) {
      return 0;
    }
    return kNoError;
  }

  static bool HasError(const std::string& conf_path) {
    const std::vector<lint::Finding> findings = lint::Lint({conf_path}, lint::Options()).findings;
    return std::any_of(findings.begin(), findings.end(), [](const lint::Finding& finding) {
      return finding.severity == lint::Severity::kError;
    });
  }

  void ExpectFailsAsTold(const std::vector<Way>& ways) {
    for (const Way& way : ways) {
      SCOPED_TRACE(way.name);
      const std::string conf_path = InstallWay(way);
      EXPECT_EQ(CodeOfAdd(conf_path), way.code);
      const Problem problem = Trial().ProblemOf(kAdd, conf_path);
      EXPECT_TRUE(problem.fails);
      EXPECT_EQ(problem.code, way.code) << problem.line;
      EXPECT_TRUE(HasError(conf_path));
    }
  }

 private:
  int installed_ = 0;
};

TEST_F(FailingAdd, BecauseOfATypeIsToldAndFoundBeforehand) { ExpectFailsAsTold(WaysOfTypes()); }

TEST_F(FailingAdd, BecauseOfATextIsToldAndFoundBeforehand) { ExpectFailsAsTold(WaysOfTexts()); }

// The device is to blame and no descriptor: nothing for the linter.
TEST_F(FailingAdd, BecauseOfTheDevicesNameIsTold) {
  test::WriteFile("/etc/tovoinfo.conf", "unique=\"nonsense\"\n");
  const std::string conf_path = InstallWay({"", Entry(R"("enable":{"model":["M1"]})"), 502});
  EXPECT_EQ(CodeOfAdd(conf_path), 502);
  EXPECT_EQ(Trial().ProblemOf(kAdd, conf_path).code, 502);
  EXPECT_FALSE(HasError(conf_path));
}

TEST_F(FailingAdd, IsNotToldOfWhatTheLibraryTakes) {
  const std::vector<Way> ways = {
      {"few members", R"({"app":"Good"})", kNoError},
      {"numbers", R"({"app":"Good","title":1,"desc":2.5,"keywords":[3,null,true]})", kNoError},
      {"odd keywords", R"({"app":"Good","keywords":[{"text":[]},{},{"text":1}]})", kNoError},
      {"odd modules", R"({"app":"Good","modules":[7,[],{"params":[]},{"params":null}]})", kNoError},
      {"scalars", R"({"app":"Good","keywords":"k","modules":5,"stringset":{}})", kNoError},
      {"odd filters", R"({"app":"Good","enable":[],"disable":7})", kNoError},
      {"lone surrogates", R"({"app":"Good","title":"a\udc00b"})", kNoError},
      {"wrong bytes", "{\"app\":\"Good\xFF\",\"title\":\"\xC3\"}", kNoError},
      {"longest id", R"({"app":)" + Long(4096) + "}", kNoError},
      {"controls", R"({"app":"Good\n","title":"\u0001\u001b"})", kNoError},
      {"not JSON", "{", kNoError},
      {"a list of nothing", "[[],7,null]", kNoError},
  };
  for (const Way& way : ways) {
    SCOPED_TRACE(way.name);
    const std::string conf_path = InstallWay(way);
    EXPECT_EQ(CodeOfAdd(conf_path), kNoError);
    EXPECT_FALSE(Trial().ProblemOf(kAdd, conf_path).fails);
  }
}

// The limits are the daemon's own.
TEST_F(FailingAdd, LimitsAreThoseOfTheDaemon) {
  const std::map<std::string, std::size_t> most = {{"id", 4096}, {"desc", kMiB}};
  for (const auto& [member, bytes] : most) {
    for (const std::size_t size : {bytes, bytes + 1}) {
      Json::Value document(Json::objectValue);
      document["id"] = "limit";
      document[member] = std::string(size, 'x');
      bool taken = true;
      try {
        velkor::appindex::elastic::IndexUpsert("enu", document);
      } catch (const Error& error) {
        EXPECT_EQ(error.code, kRejected);
        taken = false;
      }
      EXPECT_EQ(taken, RefusalsOf(document).empty()) << member << " " << size;
      EXPECT_EQ(taken, size == bytes) << member;
    }
  }
}

}  // namespace
}  // namespace tool

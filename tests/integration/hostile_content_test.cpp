// The shipped library and descriptors of every content: each call ends, in success, in an Error or
// in the JSON library's exception, as the headers say.
#include <gmock/gmock.h>
#include <json/value.h>

#include <set>
#include <string>
#include <vector>

#include "appindex/error.h"
#include "appindex/index_mgr.h"
#include "tests/integration/hostile_scale.h"
#include "tests/support/controlled_time.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"

namespace velkor::appindex {
namespace {

using test::ConfOf;
using test::ScriptedDaemon;

constexpr int kEnough = 605;

// "nothing", "120" or another code, or "JSON". A daemon that has had enough is nothing.
std::string OutcomeOf(void (*call)(const std::string&, bool), const std::string& descriptor) {
  test::WriteFile(ConfOf("App"), descriptor);
  try {
    call(ConfOf("App"), false);
  } catch (const Error& error) {
    if (error.code == kEnough) return "nothing";
    return std::to_string(static_cast<int>(error.code));
  } catch (const Json::Exception&) {
    return "JSON";
  }
  return "nothing";
}

class HostileContent : public test::DeviceRootTest {
 protected:
  ScriptedDaemon daemon_;
};

// Of many descriptors one language is enough.
class HostileTypes : public test::DeviceRootTest {
 protected:
  ScriptedDaemon daemon_{[](const Json::Value& request) {
    return request["data"]["id"] == "appindex_chs" ? test::Success()
                                                   : test::Failure(kEnough, "enough");
  }};
};

const std::vector<std::string>& Values() {
  static const std::vector<std::string> values = {"null",
                                                  "true",
                                                  "false",
                                                  "0",
                                                  "-1",
                                                  "1.5",
                                                  "1e308",
                                                  "18446744073709551615",
                                                  "-9223372036854775808",
                                                  "\"\"",
                                                  "\"text\"",
                                                  "\"a:b\"",
                                                  "\":\"",
                                                  "\"../..\"",
                                                  "[]",
                                                  "[null]",
                                                  "[true,7,\"x\"]",
                                                  "{}",
                                                  "{\"a\":null}",
                                                  "{\"model\":\"x\"}",
                                                  "{\"text\":[]}"};
  return values;
}

bool IsContainer(const std::string& value) { return value[0] == '[' || value[0] == '{'; }

// Where the library converts a value to text, containers cannot be; where it wants a text as it
// stands, everything else cannot.
const std::set<std::string> kKeywords = {"keywords", "module keywords"};
constexpr char kObjectWithAList[] = R"({"text":[]})";  // walked over as if it were a list
const std::set<std::string> kConverted = {"title", "desc", "module title", "module desc"};

std::string Expected(const std::string& member, const std::string& value) {
  if (member == "app") return value[0] == '"' ? "nothing" : "120";
  if (kKeywords.count(member) != 0 && value == kObjectWithAList) return "JSON";
  return kConverted.count(member) != 0 && IsContainer(value) ? "JSON" : "nothing";
}

// A descriptor in which the member has the value.
std::string DescriptorWith(const std::string& member, const std::string& value) {
  const auto entry = [](const std::string& rest) { return R"({"app":"App",)" + rest + "}"; };
  const auto module = [&](const std::string& rest) {
    return entry(R"("modules":[{)" + rest + R"(},{"params":"q","title":"m"}])");
  };
  if (member == "root") return value;
  if (member == "entry") return "[" + value + "," + entry(R"("title":"t")") + "]";
  if (member == "app") return R"({"app":)" + value + "}";
  if (member == "module") return entry(R"("modules":[)" + value + "]");
  if (member == "keyword text") return entry(R"("keywords":[{"text":)" + value + "}]");
  if (member == "keyword weight") {
    return entry(R"("keywords":[{"text":"k","weight":)" + value + "}]");
  }
  if (member == "enabled model") return entry(R"("enable":{"model":)" + value + "}");
  if (member == "enabled models") return entry(R"("enable":{"model":[)" + value + "]}");
  if (member == "disabled platform") return entry(R"("disable":{"platform":)" + value + "}");
  const std::string of_module = "module ";
  if (member.compare(0, of_module.size(), of_module) == 0) {
    return module("\"" + member.substr(of_module.size()) + "\":" + value);
  }
  return entry("\"" + member + "\":" + value);
}

TEST_F(HostileTypes, EveryTypeInEveryMemberEndsAsTheHeaderSays) {
  for (const std::string member : {"root",
                                   "entry",
                                   "app",
                                   "title",
                                   "desc",
                                   "keywords",
                                   "stringset",
                                   "enable",
                                   "disable",
                                   "modules",
                                   "module",
                                   "module params",
                                   "module title",
                                   "module desc",
                                   "module keywords",
                                   "module enable",
                                   "module disable",
                                   "keyword text",
                                   "keyword weight",
                                   "enabled model",
                                   "enabled models",
                                   "disabled platform"}) {
    for (const std::string& value : Values()) {
      const bool other_app = member == "root" || member == "entry";
      const std::string expected = other_app && value[0] == '{' ? "120" : Expected(member, value);
      const std::string descriptor = DescriptorWith(member, value);
      EXPECT_EQ(OutcomeOf(Add, descriptor), expected) << descriptor;
      OutcomeOf(Del, descriptor);
    }
    TakeLog();
  }
}

TEST_F(HostileTypes, KeywordsOfEveryShapeEnd) {
  for (const std::string& value : Values()) {
    for (const std::string& other : Values()) {
      const std::string outcome =
          OutcomeOf(Add, R"({"app":"App","keywords":[)" + value + "," + other + "]}");
      // An object is read as one; a list in place of a keyword cannot be a text.
      EXPECT_EQ(outcome, value[0] == '[' || other[0] == '[' ? "JSON" : "nothing") << value << other;
    }
    TakeLog();
  }
}

TEST_F(HostileContent, TextsOfWrongBytesAreSentAsUtf8) {
  const std::string wrong = "\xFF\xC3(\xED\xA0\x80";
  test::WriteFile("/var/packages/App/target/ui/texts/enu/strings",
                  "[app]\ntitle=\"" + wrong + "\"\n");
  EXPECT_EQ(OutcomeOf(Add, "{\"app\":\"" + wrong + R"(","title":"app:title","desc":"\udc00"})"),
            "nothing");
  const std::string mended = "\xEF\xBF\xBD\xEF\xBF\xBD(\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD";
  const Json::Value data = daemon_.Requests()[0]["data"];
  EXPECT_EQ(data["doc_id"].asString(), mended);
  EXPECT_EQ(data["data"]["title"].asString(), mended);
  EXPECT_EQ(data["data"]["desc"].asString(), "\xEF\xBF\xBD\xEF\xBF\xBD\xEF\xBF\xBD");
}

TEST_F(HostileContent, EscapesOfSurrogatesArePairsOrNoJson) {
  for (const char* text :
       {R"("\ud800")", R"("\ud800x")", R"("\ud800\n")", R"("\ud83")", R"("\uzzzz")"}) {
    TakeLog();
    EXPECT_EQ(OutcomeOf(Add, std::string(R"({"app":)") + text + "}"), "nothing");
    EXPECT_EQ(TakeLog().size(), 22U) << text << " is malformed in each language";
  }
  EXPECT_EQ(OutcomeOf(Add, R"({"app":"\ud83d\ude00"})"), "nothing");
  EXPECT_EQ(daemon_.Requests()[0]["data"]["doc_id"].asString(), "\xF0\x9F\x98\x80");
}

TEST_F(HostileContent, NulIsPassedOnForTheDaemonToRefuse) {
  EXPECT_EQ(OutcomeOf(Add, R"({"app":"a\u0000b","title":"\u0000"})"), "nothing");
  EXPECT_EQ(daemon_.Requests()[0]["data"]["doc_id"].asString(), std::string("a\0b", 3));
}

// One line for each malformed keyword, with all of them in it.
TEST_F(HostileContent, ManyMalformedKeywordsAreLoggedAndPassedOver) {
  const int count = test::Scaled(50, 3000);
  std::string keywords = "[{}";
  for (int i = 1; i < count; ++i) keywords += ",{}";
  EXPECT_EQ(OutcomeOf(Add, R"({"app":"App","keywords":)" + keywords + "]}"), "nothing");
  EXPECT_EQ(TakeLog().size(), 1U + 21U * static_cast<unsigned>(count));
}

TEST_F(HostileContent, ManyEntriesAndModulesAreAllSent) {
  const int count = test::Scaled(40, 2000);
  std::string modules;
  for (int i = 0; i < count; ++i) {
    modules += (i == 0 ? "" : ",") + (R"({"params":")" + std::to_string(i) + R"("})");
  }
  EXPECT_EQ(OutcomeOf(Add, R"([{"app":"A","modules":[)" + modules + R"(]},{"app":"B"}])"),
            "nothing");
  EXPECT_EQ(daemon_.Requests().size(), 21U * (static_cast<unsigned>(count) + 2));
}

}  // namespace
}  // namespace velkor::appindex

// What is shown of a descriptor, beside what the library sends of it.
#include <gmock/gmock.h>

#include <string>
#include <utility>
#include <vector>

#include "appindex/device_identity.h"
#include "appindex/index_mgr.h"
#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/scripted_daemon.h"
#include "tool/preview.h"

namespace tool {
namespace {

using ::testing::SizeIs;

constexpr char kDescriptor[] = R"([
  {"app": "Album", "title": "app:title", "desc": "app:desc",
   "keywords": ["app:kw", {"text": "JPEG", "weight": 3}, 7, {"weight": 2}, {"text": "gone",
                "weight": 0}],
   "modules": [{"params": "view=shared", "title": "shared:title", "desc": "no:such"},
               {"params": "view=elsewhere", "title": "t", "enable": {"model": ["another"]}},
               {"title": "without params"}, "no module"]},
  {"app": "Frame", "title": "app:title", "stringset": "frame", "desc": 5, "more": [],
   "modules": {"b": {"params": "2", "title": "B"}, "a": {"params": "1", "title": "A"}}},
  {"app": "Never", "title": "Never", "disable": {"platform": ["helios"]}},
  "no entry"
])";

class PreviewBesideAdd : public test::DeviceRootTest {
 protected:
  PreviewBesideAdd() {
    test::WriteFile(test::ConfOf("Album"), kDescriptor);
    WriteTexts("texts/enu", "[app]\ntitle=\"Photo Album\"\ndesc=\"d \\\"e\\\"\"\nkw=\"photos\"\n");
    WriteTexts("texts/ger", "[app]\ntitle=\"Fotoalbum\"\n[shared]\ntitle=\"Geteilt\"\n");
    WriteTexts("frame/jpn", "[app]\ntitle=\"写真立て\"\n");
  }

  static void WriteTexts(const std::string& dir, const std::string& strings) {
    test::WriteFile("/var/packages/Album/target/ui/" + dir + "/strings", strings);
  }
};

using Documents = std::vector<std::pair<std::string, Json::Value>>;

TEST_F(PreviewBesideAdd, DocumentsAreThoseThatAreSent) {
  Documents sent;
  {
    test::ScriptedDaemon daemon;
    velkor::appindex::Add(test::ConfOf("Album"), true);
    for (const Json::Value& request : daemon.Requests()) {
      const Json::Value& data = request["data"];
      if (data.isMember("doc_id")) sent.emplace_back(data["id"].asString(), data["data"]);
    }
  }
  PreviewOptions options;
  const auto& langs = velkor::appindex::GetSupportedLangs();
  options.langs.assign(langs.begin(), langs.end());
  Documents shown;
  const lint::Package package = lint::FindPackages(test::ConfOf("Album"), "")[0];
  for (PreviewDocument& made : MakePreview(package, test::ConfOf("Album"), options).documents) {
    shown.emplace_back("appindex_" + made.lang, std::move(made.document));
  }
  EXPECT_THAT(sent, SizeIs(6 * 21));
  EXPECT_EQ(shown, sent);
}

}  // namespace
}  // namespace tool

// The forms in which findings are written.
#include "tool/lint/output.h"

#include <sstream>

#include "tests/unit/lint/lint_test.h"

namespace tool::lint {
namespace {

using ::testing::HasSubstr;

Outcome OneFinding() {
  Outcome outcome;
  outcome.checked = {"/p/index.conf"};
  outcome.findings.push_back({"text-missing",
                              Severity::kWarning,
                              "/p/a,b:c/index.conf",
                              {3, 7},
                              "/desc",
                              "50% is\nmissing",
                              {"ger"}});
  return outcome;
}

TEST(LintOutput, TextIsALineAFinding) {
  Outcome outcome = OneFinding();
  outcome.findings[0].message = "is missing";
  outcome.findings.push_back(
      {"package-unknown", Severity::kNote, "/p/index.conf", {}, "", "taken for a part", {}});
  std::ostringstream out;
  WriteText(out, outcome, false);
  EXPECT_EQ(out.str(),
            "/p/a,b:c/index.conf:3:7: warning: is missing [text-missing]\n"
            "/p/index.conf: note: taken for a part [package-unknown]\n");
}

TEST(LintOutput, SeverityStandsOutOnATerminal) {
  Outcome outcome = OneFinding();
  outcome.findings[0].message = "is missing";
  std::ostringstream out;
  WriteText(out, outcome, true);
  EXPECT_EQ(out.str(),
            "/p/a,b:c/index.conf:3:7: \033[1mwarning\033[0m: is missing [text-missing]\n");
}

TEST_F(LintTest, TableShortensLongNamesByCharacters) {
  Describe(R"({"app": "A", "title": "app:ähnliche_bezeichnung_die_zu_lang_für_die_tabelle_ist"})");
  std::ostringstream out;
  WriteTables(out, Lint({dir_ / "pkg"}, options_));
  EXPECT_THAT(out.str(), HasSubstr("\napp:ähnliche_bezeichnung_die_zu_lang~ k k"));
}

TEST(LintOutput, AnnotationsAreEscaped) {
  std::ostringstream out;
  WriteAnnotations(out, OneFinding());
  EXPECT_EQ(out.str(),
            "::warning file=/p/a%2Cb%3Ac/index.conf,line=3,col=7,title=text-missing::"
            "50%25 is%0Amissing\n");
}

TEST(LintOutput, NotesAreNotices) {
  Outcome outcome = OneFinding();
  outcome.findings[0].severity = Severity::kNote;
  std::ostringstream out;
  WriteAnnotations(out, outcome);
  EXPECT_THAT(out.str(), HasSubstr("::notice file="));
}

TEST(LintOutput, JsonHasAllOfAFinding) {
  const Json::Value json = ToJson(OneFinding());
  EXPECT_EQ(json["checked"][0], "/p/index.conf");
  EXPECT_EQ(json["warnings"].asInt(), 1);
  EXPECT_EQ(json["errors"].asInt(), 0);
  const Json::Value& finding = json["findings"][0];
  EXPECT_EQ(finding["tag"], "text-missing");
  EXPECT_EQ(finding["severity"], "warning");
  EXPECT_EQ(finding["file"], "/p/a,b:c/index.conf");
  EXPECT_EQ(finding["line"].asInt(), 3);
  EXPECT_EQ(finding["column"].asInt(), 7);
  EXPECT_EQ(finding["pointer"], "/desc");
  EXPECT_EQ(finding["languages"][0], "ger");
}

TEST(LintOutput, AnnotationOfADirectoryHasNoPlace) {
  Outcome outcome;
  outcome.findings.push_back(
      {"descriptor-missing", Severity::kError, "/p/", {}, "", "there is none", {}});
  std::ostringstream out;
  WriteAnnotations(out, outcome);
  EXPECT_EQ(out.str(), "::error file=/p/,title=descriptor-missing::there is none\n");
  const Json::Value json = ToJson(outcome);
  EXPECT_EQ(json["errors"].asInt(), 1);
  EXPECT_EQ(json["findings"][0]["line"].asInt(), 0);
}

TEST(LintOutput, JsonTellsHowEachTextStands) {
  TextRow row{"app:title", {}, {"ita"}};
  row.states = {{"enu", TextState::kPresent},    {"ita", TextState::kPresent},
                {"trk", TextState::kNoLanguage}, {"fre", TextState::kNoSection},
                {"ger", TextState::kNoKey},      {"jpn", TextState::kEmpty}};
  Outcome outcome;
  outcome.tables.push_back({"/p/index.conf", "/p/texts/", {row}});
  const Json::Value table = ToJson(outcome)["texts"][0];
  EXPECT_EQ(table["file"], "/p/index.conf");
  EXPECT_EQ(table["root"], "/p/texts/");
  const Json::Value& states = table["references"]["app:title"];
  EXPECT_EQ(states["enu"], "present");
  EXPECT_EQ(states["ita"], "untranslated");
  EXPECT_EQ(states["trk"], "no-language");
  EXPECT_EQ(states["fre"], "no-section");
  EXPECT_EQ(states["ger"], "missing");
  EXPECT_EQ(states["jpn"], "empty");
}

TEST(LintOutput, JsonOfATagHasWhatExplainShows) {
  const Json::Value json = ToJson(*FindTag("description-missing"));
  EXPECT_EQ(json["tag"], "description-missing");
  EXPECT_EQ(json["severity"], SeverityName(FindTag("description-missing")->severity));
  EXPECT_FALSE(json["schema"].asBool());
  EXPECT_NE(json["summary"], "");
  EXPECT_NE(json["explanation"], "");
}

TEST_F(LintTest, TableShowsEachGapInEightyColumns) {
  WriteTexts("ger", "[app]\ntitle=\"T\"\ndesc=\"\"\n");
  WriteTexts("ita", GoodTexts("enu"));
  WriteTexts("trk", "");
  std::ostringstream out;
  WriteTables(out, Lint({dir_ / "pkg"}, options_));
  const std::string table = out.str();
  // chs cht csy dan enu fre ger hun ita jpn krn nld nor plk ptb ptg rus spn sve tha trk
  const std::string name = "app:desc" + std::string(29, ' ');
  EXPECT_THAT(table, HasSubstr("\n" + name + " . . . . . . e . = . . . . . . . . . . . -\n"));
  EXPECT_THAT(table, HasSubstr(" . . . . . . k . . . . . . . . . . . . . -\n"));
  EXPECT_THAT(table, HasSubstr(" . . . . . . s . . . . . . . . . . . . . -\n"));
  std::istringstream lines(table);
  std::string line;
  std::getline(lines, line);  // empty
  std::getline(lines, line);  // the file
  while (std::getline(lines, line)) EXPECT_LE(line.size(), 80U) << line;
}

TEST_F(LintTest, TableIsLeftOutWithoutGaps) {
  std::ostringstream out;
  WriteTables(out, Lint({dir_ / "pkg"}, options_));
  EXPECT_EQ(out.str(), "");
}

}  // namespace
}  // namespace tool::lint

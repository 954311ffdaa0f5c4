#include "host/searchd/ranking.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

#include "tests/unit/searchd/memory_index.h"

namespace searchd {
namespace {

TEST(RankingTest, PutsTitlesAboveKeywordsAboveDescriptions) {
  MemoryIndex index;
  index.Add("desc", "One", "", "about mail");
  index.Add("keyword", "Two", "two mail");
  index.Add("inside", "Webmail");
  index.Add("word beginning", "My Mailbox");
  index.Add("word", "My Mail");
  index.Add("title beginning", "Mailman");
  index.Add("title", "Mail");
  index.Add("nothing", "Calendar");
  EXPECT_EQ(index.Find("mail"), (Strings{"title", "title beginning", "word", "word beginning",
                                         "inside", "keyword", "desc"}));
}

TEST(RankingTest, PutsWordsInTheTitleAboveThoseAllOverTheDocument) {
  MemoryIndex index;
  index.Add("desc", "One", "", "a server for mail");
  index.Add("all over", "Server", "server mail");
  index.Add("keywords", "Two", "two mail server");
  index.Add("other order", "Server for Mail");
  index.Add("together", "The Mail Server");
  index.Add("title beginning", "Mail Server Pro");
  index.Add("title", "Mail Server");
  const Strings found = index.Find("mail server");
  ASSERT_EQ(found.size(), 7U);
  EXPECT_EQ(Strings(found.begin(), found.begin() + 4),
            (Strings{"title", "title beginning", "together", "other order"}));
  EXPECT_EQ(found.back(), "desc");
}

TEST(RankingTest, PutsWordsInTheKeywordsAboveThoseAllOverTheDocument) {
  MemoryIndex index;
  index.Add("all over", "Server", "server", "sends mail");
  index.Add("keywords", "One", "one mail big server");
  EXPECT_EQ(index.Find("server mail"), (Strings{"keywords", "all over"}));
}

TEST(RankingTest, CountsRepeatedKeywords) {
  MemoryIndex index;
  index.Add("a", "One", "one mail");
  index.Add("b", "Two", "two mail mail mail");
  index.Add("c", "Three", "three mail mail mail mail mail");
  index.Add("d", "Four", "four mail mail");
  EXPECT_EQ(index.Find("mail"), (Strings{"c", "b", "d", "a"}));
  EXPECT_EQ(index.Find("mai"), (Strings{"c", "b", "d", "a"}));
}

TEST(RankingTest, NoNumberOfRepetitionsBeatsATitle) {
  std::string keywords;
  for (int i = 0; i < 1000; ++i) keywords += "mail ";
  MemoryIndex index;
  index.Add("a", "One", "one " + keywords);
  index.Add("b", "Webmail");
  EXPECT_EQ(index.Find("mail"), (Strings{"b", "a"}));
}

TEST(RankingTest, RepeatedWordsOutsideTheKeywordsSayNothing) {
  MemoryIndex index;
  index.Add("1", "Mail A", "", "about letters");
  index.Add("2", "Mail Mail Mail", "", "letters letters letters");
  EXPECT_EQ(index.Find("letters"), (Strings{"1", "2"}));
}

TEST(RankingTest, OrdersEqualHitsByTitleThenId) {
  MemoryIndex index;
  index.Add("3", "Mail zebra");
  index.Add("2", "mail Äpfel");
  index.Add("9", "Mail apple");
  index.Add("1", "Mail zebra");
  EXPECT_EQ(index.Find("mail"), (Strings{"2", "9", "1", "3"}));
}

TEST(RankingTest, OrdersTitlesAsTheLanguageDoes) {
  for (const auto& [language, order] : std::vector<std::pair<std::string, Strings>>{
           {"sve", {"App Apa", "App Zon", "App Åka", "App Äta", "App Öga"}},
           {"ger", {"App Apfel", "App Ärzte", "App Auto", "App Öl", "App Zeit"}},
           {"dan", {"App Ad", "App Zo", "App Æble", "App Øl", "App Ål"}},
           {"csy", {"App Cena", "App Duha", "App Hora", "App Chata", "App Ibis"}},
           {"spn", {"App Nube", "App Ñandú", "App Oso"}},
           {"rus", {"App Ежа", "App Ёлка", "App Ель", "App Жук"}}}) {
    MemoryIndex index(language);
    for (const std::string& title : order) index.Add(title, title);
    EXPECT_EQ(index.Find("app"), order) << language;
  }
}

TEST(RankingTest, PutsApplicationsBeforeTheirParts) {
  MemoryIndex index;
  index.Add("part", "Mail alpha", "", "", "app");
  index.Add("app", "Mail beta");
  EXPECT_EQ(index.Find("mail"), (Strings{"app", "part"}));
  EXPECT_EQ(index.Find("mail a"), Strings{"part"});
}

TEST(RankingTest, PutsABetterPartBeforeAnApplication) {
  MemoryIndex index;
  index.Add("app", "Box of Mail");
  index.Add("part", "Mailing", "", "", "app");
  index.Add("repeated", "Seven", "seven letter letter", "", "app");
  index.Add("once", "Eight", "eight letter");
  EXPECT_EQ(index.Find("mail"), (Strings{"part", "app"}));
  EXPECT_EQ(index.Find("letter"), (Strings{"repeated", "once"}));
}

TEST(RankingTest, PutsWhatIsSpeltAsItWasTypedFirst) {
  MemoryIndex german("ger");
  german.Add("with", "Zürich");
  german.Add("without", "Zurich");
  EXPECT_EQ(german.Find("zürich"), (Strings{"with", "without"}));
  EXPECT_EQ(german.Find("zurich"), (Strings{"without", "with"}));
  EXPECT_EQ(german.Find("zür"), (Strings{"with", "without"}));
  EXPECT_EQ(german.Find("zur"), (Strings{"without", "with"}));

  MemoryIndex turkish("trk");
  turkish.Add("dotless", "Isı");
  turkish.Add("dotted", "İsi");
  EXPECT_EQ(turkish.Find("ısı"), (Strings{"dotless", "dotted"}));
  EXPECT_EQ(turkish.Find("isi"), (Strings{"dotted", "dotless"}));

  MemoryIndex japanese("jpn");
  japanese.Add("katakana", "メモ");
  japanese.Add("hiragana", "めも");
  EXPECT_EQ(japanese.Find("メモ"), (Strings{"katakana", "hiragana"}));
  EXPECT_EQ(japanese.Find("めも"), (Strings{"hiragana", "katakana"}));
}

TEST(RankingTest, AccentsCountLessThanThePlace) {
  MemoryIndex index("fre");
  index.Add("word beginning", "Un reseautage");
  index.Add("word", "Mon réseau");
  EXPECT_EQ(index.Find("reseau"), (Strings{"word", "word beginning"}));
}

TEST(RankingTest, PutsTheWordItselfBeforeItsOtherForms) {
  MemoryIndex index;
  index.Add("form", "One", "", "with a photo");
  index.Add("itself", "Two", "", "with photos");
  EXPECT_EQ(index.Find("photos"), (Strings{"itself", "form"}));
}

TEST(RankingTest, ScoresFallFromHitToHitAsWorthDoes) {
  for (const Role role : {Role::kTitle, Role::kKeywords, Role::kBody}) {
    EXPECT_GE(WorthOf(role, How::kWord), WorthOf(role, How::kStem));
    EXPECT_GT(WorthOf(role, How::kWord), WorthOf(role, How::kBeginning));
    EXPECT_GT(WorthOf(role, How::kBeginning), WorthOf(role, How::kInside));
  }
  EXPECT_GT(kWithoutAccents * WorthOf(Role::kTitle, How::kInside),
            WorthOf(Role::kKeywords, How::kWord) * RepetitionFactor(1000000));
  EXPECT_GT(kWithoutAccents * WorthOf(Role::kKeywords, How::kInside),
            WorthOf(Role::kBody, How::kWord) + kApplicationWorth);
  EXPECT_EQ(RepetitionFactor(0), RepetitionFactor(1));
  EXPECT_EQ(RepetitionFactor(1), 1);
}

}  // namespace
}  // namespace searchd

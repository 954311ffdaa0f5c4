#include "host/searchd/ranking.h"

namespace searchd {
namespace {

constexpr double kRepetition = 0.1;

double TitleWorth(How how) {
  switch (how) {
    case How::kWholeText:
      return 100;
    case How::kWholeBeginning:
      return 80;
    case How::kWord:
      return 60;
    case How::kStem:
      return 28;
    case How::kBeginning:
      return 50;
    default:
      return WorthOf(Role::kInsideTitle, how);
  }
}

double KeywordWorth(How how) {
  switch (how) {
    case How::kWord:
      return 30;
    case How::kBeginning:
      return 24;
    case How::kStem:
      return 22;
    case How::kInside:
      return 20;
    default:
      return 0;
  }
}

double BodyWorth(How how) {
  switch (how) {
    case How::kWholeText:
    case How::kWord:
      return 12;
    case How::kStem:
      return 11;
    case How::kBeginning:
      return 10;
    case How::kInside:
      return 8;
    default:
      return 0;
  }
}

}  // namespace

Role RoleOf(const std::string& member, const FieldRule& rule) {
  if (rule.ngram) return Role::kInsideTitle;
  if (member == "title") return Role::kTitle;
  if (member == "keywords") return Role::kKeywords;
  return Role::kBody;
}

bool IsFoundByParts(Role role) { return role == Role::kTitle || role == Role::kInsideTitle; }

bool IsShownInHits(const std::string& member) {
  return member != "keywords" && member != "search_title" && member != "score" &&
         member != "explain";
}

std::string NameOf(How how) {
  switch (how) {
    case How::kWholeText:
      return "whole";
    case How::kWord:
      return "word";
    case How::kStem:
      return "stem";
    case How::kWholeBeginning:
      return "whole beginning";
    case How::kBeginning:
      return "beginning";
    case How::kInside:
      return "inside";
    case How::kTypo:
      break;
  }
  return "typo";
}

double WorthOf(Role role, How how) {
  switch (role) {
    case Role::kTitle:
      return TitleWorth(how);
    case Role::kInsideTitle:
      return how == How::kInside ? 40 : 0;
    case Role::kKeywords:
      return KeywordWorth(how);
    case Role::kBody:
      break;
  }
  return BodyWorth(how);
}

double PhraseWorth(Role role) {
  switch (role) {
    case Role::kTitle:
      return 64;
    case Role::kKeywords:
      return 34;
    default:
      return 0;
  }
}

double RepetitionFactor(Xapian::termcount count) {
  const double repeated = count > 1 ? count - 1.0 : 0.0;
  return 1 + kRepetition * repeated / (repeated + 4);
}

}  // namespace searchd

#include "host/searchd/ranking.h"

namespace searchd {
namespace {

constexpr double kRepetition = 0.1;

}  // namespace

Role RoleOf(const std::string& member, const FieldRule& rule) {
  if (rule.ngram) return Role::kInsideTitle;
  if (member == "title") return Role::kTitle;
  if (member == "keywords") return Role::kKeywords;
  return Role::kBody;
}

bool IsShownInHits(const std::string& member) {
  return member != "keywords" && member != "search_title";
}

double WordWorth(Role role) {
  switch (role) {
    case Role::kTitle:
      return 60;
    case Role::kInsideTitle:
      return 40;
    case Role::kKeywords:
      return 30;
    case Role::kBody:
      break;
  }
  return 12;
}

double BeginningWorth(Role role) {
  switch (role) {
    case Role::kTitle:
      return 50;
    case Role::kInsideTitle:
      return 40;
    case Role::kKeywords:
      return 25;
    case Role::kBody:
      break;
  }
  return 10;
}

double WorthWeight::get_sumpart(Xapian::termcount count, Xapian::termcount,
                                Xapian::termcount) const {
  const double repeated = count > 1 ? count - 1.0 : 0.0;
  return worth_ * (1 + kRepetition * repeated / (repeated + 4));
}

double WorthWeight::get_maxpart() const { return worth_ * (1 + kRepetition); }

}  // namespace searchd

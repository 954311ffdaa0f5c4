// What a hit is worth: where in a document a word was found decides, not how rare the word is.
#pragma once

#include <xapian.h>

#include <string>

#include "host/searchd/mapping.h"

namespace searchd {

// The part that a member plays in a document.
enum class Role { kTitle, kInsideTitle, kKeywords, kBody };

Role RoleOf(const std::string& member, const FieldRule& rule);

// Members that help to find a document and are not shown with it.
bool IsShownInHits(const std::string& member);

// The worth of a whole query that is the title, and of one that the title begins with.
constexpr double kWholeTitle = 100;
constexpr double kTitleBeginning = 80;

// The worth of a query word that is a word of a member, and of one that begins one.
double WordWorth(Role role);
double BeginningWorth(Role role);

// Gives a term the worth it is scaled to, and up to a tenth more when it stands in the document
// more than once. No worth reaches the next higher one by that.
class WorthWeight : public Xapian::Weight {
 public:
  WorthWeight() { need_stat(WDF); }
  WorthWeight* clone() const override { return new WorthWeight; }
  double get_sumpart(Xapian::termcount count, Xapian::termcount, Xapian::termcount) const override;
  double get_maxpart() const override;
  double get_sumextra(Xapian::termcount, Xapian::termcount) const override { return 0; }
  double get_maxextra() const override { return 0; }

 private:
  void init(double worth) override { worth_ = worth; }

  double worth_ = 0;
};

}  // namespace searchd

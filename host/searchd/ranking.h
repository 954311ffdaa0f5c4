// What a hit is worth: where in a document a word was found decides, not how rare the word is.
#pragma once

#include <xapian.h>

#include <string>

#include "host/searchd/mapping.h"

namespace searchd {

// The part that a member plays in a document.
enum class Role { kTitle, kInsideTitle, kKeywords, kBody };

Role RoleOf(const std::string& member, const FieldRule& rule);

// Whether any part of the member's words is found, and not just parts of scripts without spaces.
bool IsFoundByParts(Role role);

// Members that help to find a document, and are not shown with it, or that hits have of their own.
bool IsShownInHits(const std::string& member);

// How a typed text and a text of a document are alike; what says less comes later.
enum class How {
  kWholeText,       // the whole text of the member
  kWord,            // a word of it
  kStem,            // another form of a word
  kWholeBeginning,  // the beginning of the whole text
  kBeginning,       // the beginning of a word
  kInside,          // a part of a word
  kTypo,            // nearly one of these
};

std::string NameOf(How how);

// What a text that was found so is worth; 0 for a How that a role does not know.
double WorthOf(Role role, How how);

// The worth of a title that is what was typed when spaces and punctuation do not count, and of one
// that is what was typed before a space: those that go on after the space come first.
constexpr double kSkeletonWorth = 79;
constexpr double kBeforeSpaceWorth = 79.5;

// The worth of two or more words that follow each other as they were typed.
double PhraseWorth(Role role);

// The worth of another form of a word that the last word may become: while "activities" is typed,
// "activity" stays found.
constexpr double kUnfinishedWorth = 5;

// Factors of the worth of what is not quite what was typed.
constexpr double kWithoutAccents = 0.98;
constexpr double kWithoutMarks = 0.9;
constexpr double kWithTypo = 0.5;
constexpr double kUnjoined = 0.99;  // without what an apostrophe joins to a word, as in "l'album"
constexpr double kApart = 0.6;      // words that were typed as one, found as several
constexpr double kScattered = 0.4;  // several words, found in more than one member

// The worth of an English name, of which only the beginning is known: it stands first among the
// keywords.
constexpr double kNameWorth = 39;
constexpr double kNameBeginningWorth = 38;

// Puts applications before their parts where both are worth the same. Less than any difference
// between two ways to find a word.
constexpr double kApplicationWorth = 0.1;

// The factor that a term's worth gets when it stands `count` times in a document: up to a tenth
// more. No worth reaches the next higher one by that.
double RepetitionFactor(Xapian::termcount count);

}  // namespace searchd

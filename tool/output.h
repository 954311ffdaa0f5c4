// What the commands write: data to standard output, everything else to standard error.
#pragma once

#include <json/value.h>

#include <string>

#include "tool/context.h"

namespace tool {

// Whether the file descriptor is a terminal that understands control sequences.
bool IsTerminal(int fd);

// Whether text on it may be emphasised: a terminal, and the user has not set NO_COLOR.
bool MayEmphasise(int fd);

// The columns of a terminal at this moment; 80 when it does not tell.
int TerminalWidth(int fd);

// `text` emphasised, faint, or as it is.
enum class Look { kPlain, kBold, kFaint };
std::string Styled(const std::string& text, Look look, bool may_emphasise);

// One JSON text on a line of its own.
void PrintJson(const Json::Value& value);

// A line for the person who waits, unless --quiet.
void Remark(const Context& context, const std::string& text);

// `count` and the noun, with an "s" unless there is one: "1 document", "2 documents".
std::string Counted(std::size_t count, const std::string& noun);

// `text` as at most `columns` characters, the last of them "~" when it was longer. Characters that
// are two columns wide count as one.
std::string Shortened(const std::string& text, std::size_t columns);

// `text` without what would end the line or command a terminal, as the names of files may: a blank
// in place of each control character.
std::string OneLine(const std::string& text);

// A length of time as a person says it: "45 s", "12 min", "3 h 5 min", "2 days".
std::string Duration(long long seconds);

}  // namespace tool

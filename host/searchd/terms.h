// The terms that a document is indexed by. The parts of an index that share a prefix are:
//   "Q"              the key of the document
//   "="              whole titles
//   0x80 + length    the words of a member, the length being that of its name, which follows; 0x80
//                    alone stands for all members that the mapping does not name
#pragma once

#include <string>

namespace searchd {

std::string KeyTerm(const std::string& document_id);

std::string WholeTitleTerm(const std::string& whole_text);

std::string FieldPrefix(const std::string& member);
std::string UnnamedFieldsPrefix();

// The term of a word. A word too long for a term is cut, and told from others that begin alike.
std::string WordTerm(const std::string& prefix, const std::string& word);

// What the terms of all words that begin with `beginning` begin with.
std::string WordTermBeginning(const std::string& prefix, const std::string& beginning);

}  // namespace searchd

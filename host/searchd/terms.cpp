#include "host/searchd/terms.h"

#include <unicode/utf8.h>

#include <array>
#include <cstdint>

namespace searchd {
namespace {

// A term has at most 245 bytes, of which a prefix takes up to 66.
constexpr std::size_t kMaxWordBytes = 160;
constexpr std::size_t kDigestBytes = 32;
constexpr std::size_t kMaxBeginningBytes = kMaxWordBytes - kDigestBytes;

constexpr unsigned char kFieldPrefix = 0x80;

std::string Cut(const std::string& text, std::size_t bytes) {
  if (text.size() <= bytes) return text;
  while (bytes > 0 && U8_IS_TRAIL(static_cast<uint8_t>(text[bytes]))) --bytes;
  return text.substr(0, bytes);
}

// FNV-1a, stable across machines because digests are stored.
std::uint64_t Hash(const std::string& text, std::uint64_t basis) {
  for (const char c : text) {
    basis = (basis ^ static_cast<unsigned char>(c)) * 0x100000001B3ULL;
  }
  return basis;
}

std::string Digest(const std::string& text) {
  constexpr std::array<std::uint64_t, 2> kBases = {0xCBF29CE484222325ULL, 0x9AE16A3B2F90404FULL};
  std::string digest;
  for (const std::uint64_t basis : kBases) {
    const std::uint64_t hash = Hash(text, basis);
    for (int shift = 60; shift >= 0; shift -= 4)
      digest += "0123456789abcdef"[(hash >> shift) & 0xF];
  }
  return digest;
}

}  // namespace

std::string KeyTerm(const std::string& document_id) { return WordTerm("Q", document_id); }

std::string FieldPrefix(const std::string& member, Space space) {
  return static_cast<char>(kFieldPrefix + member.size()) + member + static_cast<char>(space);
}

std::string WordTerm(const std::string& prefix, const std::string& word) {
  if (word.size() <= kMaxWordBytes) return prefix + word;
  return prefix + Cut(word, kMaxBeginningBytes) + Digest(word);
}

std::string WordTermBeginning(const std::string& prefix, const std::string& beginning) {
  return prefix + Cut(beginning, kMaxBeginningBytes);
}

bool IsWordOrTitle(const std::string& term) {
  if (term.compare(0, 1, kSkeletonPrefix) == 0) return true;
  const auto first = static_cast<unsigned char>(term[0]);
  const std::size_t space = 1U + (first & ~unsigned{kFieldPrefix});
  if (first < kFieldPrefix || space >= term.size()) return false;
  return term[space] == static_cast<char>(Space::kWords) ||
         term[space] == static_cast<char>(Space::kPlainWords);
}

std::string Pair(const std::string& first, const std::string& second) {
  return first + ' ' + second;
}

}  // namespace searchd

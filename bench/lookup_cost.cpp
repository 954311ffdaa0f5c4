// What one string look-up costs in a section of 10 000 keys, measured against one of 10.
#include <appindex/string_pool.h>

#include <CLI/CLI.hpp>
#include <filesystem>
#include <fstream>
#include <string>
#include <vector>

#include "bench/measure.h"

namespace {

constexpr int kSmall = 10;
constexpr int kLarge = 10000;
constexpr int kReferences = 100;
constexpr int kRounds = 101;
constexpr int kLookUpsPerRound = 10000;
constexpr double kLimit = 1.5;

std::string Key(int i) { return "key_number_" + std::to_string(i); }

void WriteTexts(const std::filesystem::path& root, int keys) {
  std::filesystem::create_directories(root / "enu");
  std::ofstream file(root / "enu" / "strings");
  file << "[section]\n";
  for (int i = 0; i < keys; ++i) file << Key(i) << "=\"The text of " << Key(i) << "\"\n";
}

// What the descriptors of an application refer to: a hundred texts at most, all over the section.
std::vector<std::string> References(int keys) {
  constexpr int kStride = 7919;  // a prime: meets keys far apart
  std::vector<std::string> references;
  for (int i = 0; i < kReferences; ++i) references.push_back("section:" + Key(i * kStride % keys));
  return references;
}

double SecondsPerRound(velkor::appindex::StringPool& pool, const std::string& dir, int keys) {
  pool.SetTextsRootByStringSet(dir + "/index.conf", std::to_string(keys));
  const std::vector<std::string> references = References(keys);
  std::size_t bytes = 0;
  const double seconds = bench::SecondsOf([&] {
    for (int i = 0; i < kLookUpsPerRound; ++i) {
      bytes += pool.GetString("enu", references[static_cast<std::size_t>(i % kReferences)]).size();
    }
  });
  if (bytes == 0) throw std::runtime_error("the texts were not found");
  return seconds;
}

}  // namespace

int main(int argc, char** argv) {
  CLI::App app("Cost of a string look-up by the size of its section");
  std::string dir;
  app.add_option("dir", dir, "An empty directory for the texts")->required();
  CLI11_PARSE(app, argc, argv);

  WriteTexts(dir + "/" + std::to_string(kSmall), kSmall);
  WriteTexts(dir + "/" + std::to_string(kLarge), kLarge);
  velkor::appindex::StringPool pool;
  SecondsPerRound(pool, dir, kSmall);
  SecondsPerRound(pool, dir, kLarge);
  std::vector<double> small;
  std::vector<double> large;
  for (int round = 0; round < kRounds; ++round) {
    small.push_back(SecondsPerRound(pool, dir, kSmall));
    large.push_back(SecondsPerRound(pool, dir, kLarge));
  }
  const double nanoseconds = bench::Median(small) / kLookUpsPerRound * 1e9;
  std::printf("look-up in a section of %d keys: %.0f ns\n", kSmall, nanoseconds);
  return bench::Judge("look-up in 10 000 keys / look-up in 10 keys",
                      bench::Median(large) / bench::Median(small), kLimit);
}

#include "bench/costs/content.h"

#include <appindex/device_identity.h>

#include <filesystem>
#include <fstream>
#include <stdexcept>

namespace bench {

void WriteContent(const std::string& path, const std::string& content) {
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::ofstream file(path);
  file << content;
  if (!file.flush()) throw std::runtime_error("cannot write " + path);
}

std::string TextKey(long n) { return "key_number_" + std::to_string(n); }

std::string Strings(long texts) {
  std::string content = "[section]\n";
  for (long n = 0; n < texts; ++n) {
    content += TextKey(n) + "=\"The text of " + TextKey(n) + "\"\n";
  }
  return content;
}

void WriteTexts(const std::string& root, long texts) {
  const std::string content = Strings(texts);
  for (const std::string& lang : velkor::appindex::GetSupportedLangs()) {
    WriteContent(root + "/" + lang + "/strings", content);
  }
}

namespace {

constexpr long kTextsUsed = 100;

std::string Reference(long n) { return "\"section:" + TextKey(n % kTextsUsed) + "\""; }

// Title, description and keywords: what an entry and a module have in common.
std::string TextMembers(long n) {
  return "\n    \"title\": " + Reference(n) + ",\n    \"desc\": " + Reference(n + 1) +
         ",\n    \"keywords\": [{\"text\": " + Reference(n + 2) + ", \"weight\": 3}, " +
         Reference(n + 3) + ", \"DNS\"]";
}

}  // namespace

std::string DescriptorText(const std::string& app, long modules) {
  std::string content = "{\n    \"app\": \"" + app + "\"," + TextMembers(0);
  for (long n = 0; n < modules; ++n) {
    content += n == 0 ? ",\n  \"modules\": [\n" : ",\n";
    content += "  {\"params\": \"page=" + std::to_string(n) + "\"," + TextMembers(n) + "}";
  }
  return content + (modules > 0 ? "]}\n" : "}\n");
}

void WritePackages(long packages) {
  constexpr long kTexts = 20;
  for (long n = 0; n < packages; ++n) {
    const std::string name = "Package" + std::to_string(n);
    const std::string ui = "/var/packages/" + name + "/target/ui";
    WriteContent(ui + "/index.conf", DescriptorText(name, 1));
    WriteTexts(ui + "/texts", kTexts);
  }
}

}  // namespace bench

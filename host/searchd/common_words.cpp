#include "host/searchd/common_words.h"

#include <algorithm>
#include <set>
#include <string>
#include <utility>

#include "host/searchd/terms.h"

namespace searchd {
namespace {

// With fewer documents, half of them says nothing.
constexpr Xapian::doccount kFewDocuments = 8;

const std::vector<std::string>& CommonWords() {
  static const std::vector<std::string> words = [] {
    std::vector<std::string> all;
    for (const char* text :
         {"app apps application applications program programs software setting settings",
          "anwendung anwendungen programm programme einstellung einstellungen",
          "logiciel logiciels paramètre paramètres réglage réglages",
          "applicazione applicazioni programma programmi impostazione impostazioni",
          "aplicación aplicaciones programa programas ajuste ajustes configuración",
          "aplicação aplicações aplicativo aplicativos configurações definições",
          "toepassing toepassingen instelling instellingen programma's",
          "programmer indstilling indstillinger innstilling innstillinger",
          "inställning inställningar applikation applikationer",
          "aplikace programy nastavení aplikacja aplikacje programy ustawienia",
          "alkalmazás alkalmazások beállítás beállítások", "uygulama uygulamalar ayar ayarlar",
          "приложение приложения программа программы настройка настройки",
          "アプリケーション アプリ ソフトウェア ソフト 設定",
          "应用程序 应用 程序 软件 设置 應用程式 程式 軟體 設定",
          "애플리케이션 앱 프로그램 소프트웨어 설정", "แอปพลิเคชัน แอป แอพ โปรแกรม การตั้งค่า ตั้งค่า"}) {
      for (std::string& word : SplitWhiteSpace(text)) all.push_back(std::move(word));
    }
    return all;
  }();
  return words;
}

const std::set<std::string>& PlainCommonWords() {
  static const std::set<std::string> words = [] {
    const Analyzer analyzer{Language{}};
    std::set<std::string> plain;
    for (const std::string& word : CommonWords()) plain.insert(analyzer.WholeText(word).plain);
    return plain;
  }();
  return words;
}

// Those that are written without spaces around them.
const std::vector<std::string>& DenseCommonWords() {
  static const std::vector<std::string> words = [] {
    std::vector<std::string> dense = CommonWords();
    const auto is_parted = [](const std::string& word) { return DenseCharacters(word).empty(); };
    dense.erase(std::remove_if(dense.begin(), dense.end(), is_parted), dense.end());
    return dense;
  }();
  return words;
}

bool StandsInHalfOfTheTitles(const Word& word, const std::vector<Field>& fields,
                             const Xapian::Database& database) {
  const Xapian::doccount documents = database.get_doccount();
  if (documents < kFewDocuments) return false;
  for (const Field& field : fields) {
    if (field.role != Role::kTitle) continue;
    const auto stands = [&](Space space, const std::string& form) {
      const std::string term = WordTerm(FieldPrefix(field.member, space), form);
      return database.get_termfreq(term) >= documents - documents / 2;
    };
    if (stands(Space::kWords, word.raw) || stands(Space::kWords, word.plain) ||
        stands(Space::kPlainWords, word.plain)) {
      return true;
    }
  }
  return false;
}

}  // namespace

bool IsCommonWord(const Analyzer& analyzer, const std::string& word) {
  return PlainCommonWords().count(analyzer.WholeText(word).plain) != 0;
}

std::vector<std::string> PartCommonWords(const std::string& text) {
  std::vector<std::string> parts;
  for (const std::string& part : SplitWhiteSpace(text)) {
    std::string rest = part;
    std::string behind;
    for (const std::string& word : DenseCommonWords()) {
      if (rest.size() <= word.size()) continue;
      if (rest.compare(0, word.size(), word) == 0) {
        parts.push_back(word);
        rest.erase(0, word.size());
        break;
      }
      if (rest.compare(rest.size() - word.size(), word.size(), word) == 0) {
        rest.erase(rest.size() - word.size());
        behind = word;
        break;
      }
    }
    parts.push_back(rest);
    if (!behind.empty()) parts.push_back(behind);
  }
  return parts;
}

void MarkCommonWords(Plan& plan, const std::vector<Field>& fields, const Analyzer& analyzer,
                     const Xapian::Database& database) {
  for (Reading* reading : {&plan.parts, &plan.words}) {
    for (Clause& clause : *reading) {
      clause.optional = IsCommonWord(analyzer, clause.text) ||
                        StandsInHalfOfTheTitles(analyzer.WholeText(clause.text), fields, database);
    }
  }
}

bool MarkUnfinishedCommonWord(Plan& plan, const Analyzer& analyzer) {
  if (plan.parts.size() < 2) return false;
  Clause& last = plan.parts.back();
  const std::string plain = analyzer.WholeText(last.text).plain;
  const auto word = PlainCommonWords().lower_bound(plain);
  if (plain.empty() || last.optional || word == PlainCommonWords().end() ||
      word->compare(0, plain.size(), plain) != 0) {
    return false;
  }
  last.optional = true;
  return true;
}

}  // namespace searchd

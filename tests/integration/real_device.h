// A device root with three small applications and the real search daemon.
#pragma once

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "tests/support/device_root_test.h"
#include "tests/support/indexing.h"
#include "tests/support/real_daemon.h"

namespace test {

constexpr char kFilesConf[] = "/usr/tovo/tovoman/webman/modules/Files/index.conf";

class RealDeviceTest : public DeviceRootTest {
 protected:
  RealDeviceTest() {
    InstallPackage("Backup", {{"enu", "Backup Center"},
                              {"ger", "Datensicherung"},
                              {"tha", "ศูนย์สำรองข้อมูล"},
                              {"jpn", "バックアップセンター"}});
    InstallPackage("Photos", {{"enu", "Photo Album"},
                              {"ger", "Fotoalbum"},
                              {"tha", "อัลบั้มรูปภาพ"},
                              {"jpn", "写真アルバム"}});
    WriteFile("/usr/tovo/tovoman/webman/texts/enu/strings", "[files]\ntitle=\"File Browser\"\n");
    WriteFile("/usr/tovo/tovoman/webman/texts/ger/strings", "[files]\ntitle=\"Dateimanager\"\n");
    WriteFile(kFilesConf, R"({"app":"Files","title":"files:title","keywords":["everything"],
        "modules":[{"params":"tab=trash","title":"Recycle Bin","keywords":["everything"]}]})");
  }

  // Installs a package whose title is `titles` of each language.
  static void InstallPackage(const std::string& name,
                             const std::map<std::string, std::string>& titles) {
    for (const auto& [lang, title] : titles) {
      std::string strings = "[app]\ntitle=\"";
      strings += title;
      strings += "\"\n";
      WriteFile("/var/packages/" + name + "/target/ui/texts/" + lang + "/strings", strings);
    }
    WriteFile(ConfOf(name),
              R"({"app":")" + name + R"(","title":"app:title","keywords":["everything"]})");
  }

  // The ids found, in byte order.
  static std::vector<std::string> Found(const std::string& lang, const std::string& query) {
    std::vector<std::string> ids = RealDaemon::Search(lang, query);
    std::sort(ids.begin(), ids.end());
    return ids;
  }

  // What is to be found of all applications, by language: each has the keyword "everything".
  static std::map<std::string, std::vector<std::string>> Everything() {
    std::map<std::string, std::vector<std::string>> found;
    for (const std::string& lang : LangsInOrder()) found[lang] = Found(lang, "everything");
    return found;
  }

  // The same when the index of each language holds exactly these ids.
  static std::map<std::string, std::vector<std::string>> Exactly(
      const std::vector<std::string>& ids) {
    std::map<std::string, std::vector<std::string>> found;
    for (const std::string& lang : LangsInOrder()) found[lang] = ids;
    return found;
  }

  RealDaemon daemon_{OutsideRootFd(), OutsidePath()};
};

}  // namespace test

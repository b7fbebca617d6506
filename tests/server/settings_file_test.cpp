#include "settings_file.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include "sandbox.h"

namespace vorn::server {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

std::vector<std::string> FaultsOf(std::string_view text) {
  std::vector<std::string> faults;
  for (const FileFault& fault : ParseSettings(text).faults) {
    faults.push_back(std::to_string(fault.place.line) + ":" + std::to_string(fault.place.column) + ": " + fault.text);
  }
  return faults;
}

TEST(SettingsFile, GivesSettings) {
  const SettingsFile file = ParseSettings(
      "# comment\n; comment\n\n  [server]  \nlisten=unix:/a\t127.0.0.1:1\n\t host-names =  nas  \n[ sessions ]\nidle = "
      "1min");
  EXPECT_THAT(file.faults, IsEmpty());
  EXPECT_THAT(file.settings.listen.each, ElementsAre("unix:/a", "127.0.0.1:1"));
  EXPECT_THAT(file.settings.host_names.each, ElementsAre("nas"));
  EXPECT_EQ(file.settings.session_idle.time, std::chrono::seconds(60));
  const Place place = file.places.at(FindSetting("server", "host-names"));
  EXPECT_EQ(place.line, 6);
  EXPECT_EQ(place.column, 17);
}

TEST(SettingsFile, HasDefaultsIfItIsEmpty) {
  for (const char* text : {"", "\n", "# only a comment", "[server]\n[log]\n"}) {
    const SettingsFile file = ParseSettings(text);
    EXPECT_THAT(file.faults, IsEmpty()) << text;
    EXPECT_THAT(file.places, IsEmpty()) << text;
  }
}

TEST(SettingsFile, IsRefusedWithLineAndColumn) {
  const std::pair<const char*, const char*> cases[] = {
      {"[nothing]\nkey = 1", "1:1: there is no section [nothing]"},
      {"[Server]", "1:1: there is no section [Server]"},
      {" [server", "1:9: \"]\" is missing"},
      {"[server] # main", "1:16: \"]\" is missing"},
      {"[server]\n[log]\n [server]", "3:2: [server] began in line 1"},
      {"listen = unix:/a", "1:1: a key before the first [section]"},
      {"[server]\n  listen", "2:3: no comment, no [section] and no key = value"},
      {"[server]\n  lissten = 1", "2:3: there is no key \"lissten\" in [server]"},
      {"[server]\nhead-time = 1s", "2:1: there is no key \"head-time\" in [server]; it belongs to [limits]"},
      {"[server]\n= 1", "2:1: there is no key \"\" in [server]"},
      {"[log]\nlevel = info\n level = info", "3:2: \"level\" is given in line 2 already"},
      {"[log]\nlevel = info # for now", "2:14: a comment has a line of its own"},
      {"[log]\nlevel =", "2:8: level: \"\" is not error, warning, notice, info or debug"},
      {"[log]\nlevel = info\r\n", "2:13: a control character; lines end with a line feed"},
      {"[server]\nhost-names = nas  n_s",
       "2:19: host-names: \"n_s\": no host name or address (without a port; an "
       "IPv6 address is in brackets)"},
      {"\xEF\xBB\xBF[server]", "1:1: no comment, no [section] and no key = value"},
  };
  for (const auto& [text, fault] : cases) EXPECT_THAT(FaultsOf(text), ElementsAre(fault)) << text;
  EXPECT_EQ(FaultsOf(std::string_view("[log]\n\0", 7)).size(), 1U);
}

TEST(SettingsFile, ReportsEveryFault) {
  EXPECT_THAT(FaultsOf("[log]\nlevel = loud\naccess = maybe\n[serve]\nlisten = x\n[server]\nmodules = m\n"),
              ElementsAre("2:9: level: \"loud\" is not error, warning, notice, info or debug",
                          "3:10: access: \"maybe\" is neither yes nor no", "4:1: there is no section [serve]",
                          "7:11: modules: \"m\" is no absolute path"));
}

}  // namespace
}  // namespace vorn::server

// The table of settings, and the manual page and the installed file that describe it.
#include "settings.h"

#include <gmock/gmock.h>

#include <map>
#include <regex>
#include <sstream>

#include "sandbox.h"
#include "settings_file.h"

namespace vorn::server {
namespace {

using testing::IsEmpty;

// Keys as "[section] key", in the order of a document, with what it says about them.
using Description = std::vector<std::pair<std::string, std::string>>;

std::string NameOf(std::string_view section, std::string_view key) {
  return "[" + std::string(section) + "] " + std::string(key);
}

// Reads the document line by line. `section` and `key` are patterns; the first group of a key is its name.
Description ReadDescription(const std::string& path, const std::regex& section, const std::regex& key) {
  std::istringstream lines(ReadWholeFile(path));
  Description description;
  std::string current;
  std::smatch match;
  for (std::string line; std::getline(lines, line);) {
    if (std::regex_match(line, match, section)) current = match[1];
    if (std::regex_match(line, match, key)) description.emplace_back(NameOf(current, match[1].str()), match[2]);
  }
  return description;
}

std::string WithoutEscapes(std::string text) { return std::regex_replace(text, std::regex(R"(\\-)"), "-"); }

TEST(Settings, HaveDefaultsThatParse) {
  for (const Setting& each : SettingsTable()) {
    Settings settings;
    const std::string standard = each.format(settings);
    EXPECT_EQ(each.parse(standard, &settings), std::nullopt) << each.key;
    EXPECT_EQ(each.format(settings), standard) << each.key;
  }
  EXPECT_THAT(FindContradictions(Settings{}), IsEmpty());
}

TEST(Settings, AreFoundBySectionAndKey) {
  for (const Setting& each : SettingsTable()) EXPECT_EQ(FindSetting(each.section, each.key), &each) << each.key;
  EXPECT_EQ(FindSetting("server", "level"), nullptr);
}

TEST(Settings, AreAllInTheInstalledFileWithTheirDefaults) {
  Description expected;
  for (const Setting& each : SettingsTable()) {
    expected.emplace_back(NameOf(each.section, each.key), each.format(Settings{}));
  }
  EXPECT_EQ(ReadDescription(CONFIGURATION_FILE, std::regex(R"(\[(.*)\])"), std::regex("#([a-z-]+) =(?: (.*))?")),
            expected);
  const SettingsFile file = ParseSettings(ReadWholeFile(CONFIGURATION_FILE));
  EXPECT_THAT(file.faults, IsEmpty());
  EXPECT_THAT(file.places, IsEmpty()) << "every key is a comment";
}

TEST(Settings, AreAllInTheManualPageWithTheirDefaults) {
  Description expected;
  for (const Setting& each : SettingsTable()) {
    const std::string standard = each.format(Settings{});
    expected.emplace_back(NameOf(each.section, each.key), std::string(each.reloads ? "reload" : "restart") +
                                                              (standard.empty() ? "" : " = " + standard));
  }
  Description page = ReadDescription(MANUAL_PAGE, std::regex(R"re(\.SS \[(.*)\])re"),
                                     std::regex(R"re(\.BR ([a-z\\-]+) (" \(re.*))re"));
  for (auto& [name, description] : page) {
    name = WithoutEscapes(name);
    description =
        std::regex_replace(WithoutEscapes(description), std::regex(R"re(" \((.*?)\)"(?: "( = .*)")?)re"), "$1$2");
  }
  EXPECT_EQ(page, expected);
}

TEST(Settings, ThatContradictEachOtherAreFound) {
  const struct {
    const char* section;
    const char* key;
    const char* value;
    const char* found;
  } cases[] = {
      {"sessions", "lifetime", "29min", "idle"},
      {"sessions", "total", "15", "per-account"},
      {"limits", "tcp-connections", "127", "tcp-connections-per-address"},
      {"limits", "body-memory", "3MiB", "body-memory-per-address"},
      {"access", "readers", "vorn-admin", "readers"},
  };
  for (const auto& c : cases) {
    Settings settings;
    ASSERT_EQ(FindSetting(c.section, c.key)->parse(c.value, &settings), std::nullopt);
    const auto found = FindContradictions(settings);
    ASSERT_EQ(found.size(), 1U) << c.key;
    EXPECT_EQ(found[0].setting->key, c.found);
  }
}

TEST(Settings, BecomeLimitsOfTheTransport) {
  const HttpLimits standard;
  const HttpLimits limits = HttpLimitsOf(Settings{});
  EXPECT_EQ(limits.tcp_connections.total, standard.tcp_connections.total);
  EXPECT_EQ(limits.tcp_connections.per_address, standard.tcp_connections.per_address);
  EXPECT_EQ(limits.unix_connections.total, standard.unix_connections.total);
  EXPECT_EQ(limits.head, standard.head);
  EXPECT_EQ(limits.body, standard.body);
  EXPECT_EQ(limits.idle, standard.idle);
  EXPECT_EQ(limits.write, standard.write);
}

}  // namespace
}  // namespace vorn::server

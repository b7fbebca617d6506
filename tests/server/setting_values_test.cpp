#include "setting_values.h"

#include <gtest/gtest.h>

#include <utility>

namespace vorn::server {
namespace {

// Parses the text and formats the value again; a fault is "OFFSET: TEXT".
template <typename Value>
std::string Again(std::string_view text) {
  Value value{};
  if (const auto fault = ParseValue(text, &value)) return std::to_string(fault->offset) + ": " + fault->text;
  return FormatValue(value);
}

using Cases = std::vector<std::pair<const char*, const char*>>;

template <typename Value>
void ExpectAll(const Cases& cases) {
  for (const auto& [text, result] : cases) EXPECT_EQ(Again<Value>(text), result) << text;
}

TEST(SettingValues, OfTimesHaveAUnit) {
  ExpectAll<Duration>({{"1s", "1s"},
                       {"60s", "1min"},
                       {"90min", "90min"},
                       {"120min", "2h"},
                       {"366d", "366d"},
                       {"", "0: \"\" is no time, a number with s, min, h or d"},
                       {"10", "2: \"10\" is no time, a number with s, min, h or d"},
                       {"10 min", "2: \"10 min\" is no time, a number with s, min, h or d"},
                       {"-1s", "0: \"-1s\" is no time, a number with s, min, h or d"},
                       {"0s", "0: \"0s\" is not from 1s to 366d"},
                       {"367d", "0: \"367d\" is not from 1s to 366d"},
                       {"213503982334602d", "0: \"213503982334602d\" is too large"}});
}

TEST(SettingValues, OfSizesHaveAUnit) {
  ExpectAll<ByteCount>({{"64KiB", "64KiB"},
                        {"1024KiB", "1MiB"},
                        {"1GiB", "1GiB"},
                        {"63KiB", "0: \"63KiB\" is not from 64KiB to 1GiB"},
                        {"2GiB", "0: \"2GiB\" is not from 64KiB to 1GiB"},
                        {"4MB", "1: \"4MB\" is no size, a number with KiB, MiB or GiB"}});
}

TEST(SettingValues, OfCountsAreNumbers) {
  ExpectAll<Count>({{"1", "1"},
                    {"65536", "65536"},
                    {"0", "0: \"0\" is no number from 1 to 65536"},
                    {"65537", "0: \"65537\" is no number from 1 to 65536"},
                    {"1x", "0: \"1x\" is no number from 1 to 65536"},
                    {"", "0: \"\" is no number from 1 to 65536"}});
}

TEST(SettingValues, OfListsAreSeparatedByBlanks) {
  ExpectAll<HostNames>({{"", ""},
                        {"nas", "nas"},
                        {"nas.example \t 192.0.2.1  [2001:db8::1]", "nas.example 192.0.2.1 [2001:db8::1]"},
                        {"nas other nas", "10: \"nas\": given twice"}});
  const std::string fault = ": no host name or address (without a port; an IPv6 address is in brackets)";
  const std::string long_label(64, 'a');
  for (const std::string& name :
       {std::string("nas:443"), std::string("2001:db8::1"), std::string("-nas"), std::string("nas-"),
        std::string("nas..example"), std::string("nas."), std::string("n_s"), std::string("https://nas"), long_label}) {
    EXPECT_EQ(Again<HostNames>("a " + name), "2: \"" + name + "\"" + fault);
  }
}

TEST(SettingValues, OfAddressesAreThoseToListenAt) {
  EXPECT_EQ(Again<ListenAddresses>("unix:/run/s [::1]:80"), "unix:/run/s [::1]:80");
  EXPECT_EQ(Again<ListenAddresses>("unix:/run/s 192.0.2.1:80").substr(0, 20), "12: \"192.0.2.1:80\": ");
}

TEST(SettingValues, OfOtherKindsAreWords) {
  ExpectAll<FilePath>({{"", ""}, {"/a b", "/a b"}, {"a", "0: \"a\" is no absolute path"}});
  ExpectAll<GroupName>({{"vorn-admin", "vorn-admin"},
                        {"", "0: the name of a group is missing"},
                        {"a b", "1: \"a b\" is no name of a group"}});
  ExpectAll<LogLevel>(
      {{"error", "error"}, {"debug", "debug"}, {"Info", "0: \"Info\" is not error, warning, notice, info or debug"}});
  ExpectAll<bool>({{"yes", "yes"}, {"no", "no"}, {"true", "0: \"true\" is neither yes nor no"}});
}

}  // namespace
}  // namespace vorn::server

#include "address_ranges.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace vorn {
namespace {

std::string RangeText(const std::string& client) {
  const std::optional<AddressRange> range = AddressRangeOf(client);
  return range ? TextOf(range->first) + " " + TextOf(range->last) : "";
}

TEST(AddressRangeOf, ReadsAddressesAndNetworks) {
  const std::pair<const char*, const char*> cases[] = {
      {"10.0.0.5", "10.0.0.5 10.0.0.5"},
      {"10.0.0.0/24", "10.0.0.0 10.0.0.255"},
      {"10.0.0.77/255.255.255.192", "10.0.0.64 10.0.0.127"},
      {"10.0.0.0/0.0.0.0", "0.0.0.0 255.255.255.255"},
      {"fd00::/65", "fd00:: fd00::7fff:ffff:ffff:ffff"},
      {"FD00:0::1", "fd00::1 fd00::1"},
      {"10.0.0.0/33", ""},
      {"10.0.0.0/x", ""},
      {"10.0.0.0/255.0.255.0", ""},
      {"host.example", ""},
      {"*.example", ""},
      {"@hosts", ""},
      {"*", ""},
      {"", ""},
  };
  for (const auto& [client, range] : cases) EXPECT_EQ(RangeText(client), range) << client;
}

TEST(FirstHostOf, IsNotTheAddressOfTheNetwork) {
  const std::pair<const char*, const char*> cases[] = {{"10.0.0.0/24", "10.0.0.1"},
                                                       {"10.0.0.254/31", "10.0.0.254"},
                                                       {"10.0.0.255", "10.0.0.255"},
                                                       {"fd00::/64", "fd00::1"}};
  for (const auto& [network, host] : cases) EXPECT_EQ(TextOf(FirstHostOf(*AddressRangeOf(network))), host) << network;
}

// The first address of a network that the ranges leave free; "none" if there is none.
std::string FirstFree(const std::string& network, const std::vector<std::string>& ranges) {
  AddressRanges all;
  for (const std::string& range : ranges) all.Add(*AddressRangeOf(range));
  all.Sort();
  const std::optional<AddressRange> wanted = AddressRangeOf(network);
  const std::optional<AddressBytes> free = all.FirstFree(*wanted, FirstHostOf(*wanted));
  return free ? TextOf(*free) : "none";
}

TEST(AddressRanges, FindTheFirstFreeAddressOfANetwork) {
  EXPECT_EQ(FirstFree("10.0.0.0/24", {}), "10.0.0.1");
  EXPECT_EQ(FirstFree("10.0.0.0/24", {"10.0.0.2", "10.0.0.1", "10.0.0.4"}), "10.0.0.3");
  EXPECT_EQ(FirstFree("10.0.0.0/16", {"10.0.0.0/24", "10.0.0.0/25", "10.0.1.0", "10.0.3.0/24"}), "10.0.1.1");
  EXPECT_EQ(FirstFree("10.0.0.0/24", {"9.0.0.0/8", "11.0.0.0/8", "fd00::1"}), "10.0.0.1");
  EXPECT_EQ(FirstFree("10.0.255.0/24", {"10.0.255.0/25"}), "10.0.255.128");
  EXPECT_EQ(FirstFree("fd00::/64", {"fd00::/65", "fd00::8000:0:0:0"}), "fd00::8000:0:0:1");
}

TEST(AddressRanges, DoNotCountForANetworkThatTheyContain) {
  EXPECT_EQ(FirstFree("10.0.0.0/24", {"10.0.0.0/24", "10.0.0.0/8", "0.0.0.0/0.0.0.0"}), "10.0.0.1");
}

TEST(AddressRanges, LeaveNoAddressFree) {
  EXPECT_EQ(FirstFree("10.0.0.0/30", {"10.0.0.1", "10.0.0.2"}), "none");  // 10.0.0.3 is the broadcast address
  EXPECT_EQ(FirstFree("10.0.0.0/31", {"10.0.0.0", "10.0.0.1"}), "none");
  EXPECT_EQ(FirstFree("255.255.255.0/24", {"255.255.255.0/25", "255.255.255.128/25"}), "none");
  EXPECT_EQ(FirstFree("fd00::/127", {"fd00::", "fd00::1"}), "none");
}

}  // namespace
}  // namespace vorn

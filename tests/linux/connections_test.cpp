#include "connections.h"

#include <arpa/inet.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <vector>

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// An address as proc(5) shows it: words of 32 bits in the byte order of the machine.
std::string Hex(int family, const char* address) {
  std::uint32_t words[4] = {};
  inet_pton(family, address, words);
  std::string digits;
  for (int i = 0; i < (family == AF_INET ? 1 : 4); ++i) {
    char word[9];
    std::snprintf(word, sizeof word, "%08X", words[i]);
    digits += word;
  }
  return digits;
}

std::string Line(int family, const char* client, const char* ports, const char* state) {
  const std::string local(family == AF_INET ? "0100007F" : "00000000000000000000000001000000");
  const std::string local_port(ports, 4);
  return "   1: " + local + ":" + local_port + " " + Hex(family, client) + ":" + std::string(ports + 5) + " " + state +
         " 00000000:00000000 00:00000000 00000000     0        0 12345 1 0000000000000000 20 4 30 10 -1\n";
}

constexpr char kHeading[] = "  sl  local_address rem_address   st tx_queue rx_queue tr tm->when retrnsmt\n";

std::vector<std::string> Addresses(const std::string& text) {
  std::vector<std::string> addresses;
  for (const Connection& connection : ParseConnections(text, 2049)) {
    addresses.push_back(connection.address + " " + std::to_string(connection.port));
  }
  return addresses;
}

TEST(Connections, AreTheEstablishedOnesOfThePort) {
  const std::string text = kHeading + Line(AF_INET, "10.9.0.11", "0801 0367", "01") +
                           Line(AF_INET, "10.9.0.12", "0801 0367", "06") +  // TIME_WAIT
                           Line(AF_INET, "10.9.0.13", "0016 0367", "01") +  // ssh
                           Line(AF_INET, "0.0.0.0", "0801 0000", "0A") +    // listening
                           Line(AF_INET, "10.9.0.14", "0801 0368", "01");
  EXPECT_THAT(Addresses(text), ElementsAre("10.9.0.11 871", "10.9.0.14 872"));
}

TEST(Connections, HaveTheUsualFormOfAnIPv6Address) {
  const std::string text =
      kHeading + Line(AF_INET6, "fd00:9::b", "0801 0367", "01") + Line(AF_INET6, "::ffff:10.9.0.11", "0801 0368", "01");
  EXPECT_THAT(Addresses(text), ElementsAre("fd00:9::b 871", "10.9.0.11 872"));
}

TEST(Connections, AreNoneInTextOfAnotherForm) {
  for (const char* text : {"", "\n", "noise", "1: 0100007F:0801", "1: :0801 :0367 01", "1: 0100007F:0801 0B:0367 01\n",
                           "1: 0100007F:0801 0B00090G:0367 01\n", "1: 0100007F 0B00090A:0367 01\n"}) {
    EXPECT_THAT(Addresses(text), IsEmpty()) << text;
  }
}

std::vector<std::string> Mounts(const char* text) {
  std::vector<std::string> mounts;
  for (const RecordedMount& mount : ParseRecordedMounts(text)) mounts.push_back(mount.client + " " + mount.path);
  return mounts;
}

TEST(RecordedMounts, HaveAClientAndAPath) {
  EXPECT_THAT(Mounts("10.9.0.11:/srv/data:0x00000001\nfd00:9:0::b:/srv/data:0x00000002\nclient.lab.test:/srv:0x1\n"),
              ElementsAre("10.9.0.11 /srv/data", "fd00:9::b /srv/data", "client.lab.test /srv"));
}

TEST(RecordedMounts, MayHaveColonsInThePath) {
  EXPECT_THAT(Mounts("10.9.0.11:/srv/a:b:0x2:/c:0x00000001\n"), ElementsAre("10.9.0.11 /srv/a:b:0x2:/c"));
}

TEST(RecordedMounts, AreNoneInTextOfAnotherForm) {
  EXPECT_THAT(Mounts("\n:/srv:0x1\n10.9.0.11:/srv\nnoise\n10.9.0.11:srv:0x1\n:0x1"), IsEmpty());
}

}  // namespace
}  // namespace vorn

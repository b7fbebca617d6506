#include "client_states.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <string>

namespace vorn {
namespace {

constexpr std::uint64_t kID = 0x6d077c99675dd2b3;
constexpr char kClientID[] = "0x6d077c99675dd2b3";

// The digits of a state id of the client, as the kernel prints the bytes of its memory.
std::string StateID(unsigned number, std::uint64_t client = kID) {
  unsigned char bytes[sizeof client];
  std::memcpy(bytes, &client, sizeof client);
  char digits[2 * sizeof client + 1];
  for (std::size_t i = 0; i < sizeof client; ++i) std::snprintf(digits + 2 * i, 3, "%02x", unsigned{bytes[i]});
  char whole[64];
  std::snprintf(whole, sizeof whole, "00000001%s%08x", digits, number);
  return whole;
}

std::string Open(unsigned number, const std::string& file, const std::string& name, std::uint64_t client = kID) {
  return "- 0x" + StateID(number, client) + ": { type: open, access: rw, deny: --, superblock: \"62:00:" + file +
         "\", filename: \"" + name + "\", owner: \"open id:\\x00\" }\n";
}

std::string Lock(unsigned number, const std::string& name) {
  return "- 0x" + StateID(number) + ": { type: lock, superblock: \"62:00:12\", filename: \"" + name +
         "\", owner: \"lock id:\\x00\" }\n";
}

std::string Delegation(unsigned number) {
  return "- 0x" + StateID(number) + ": { type: deleg, access: r, superblock: \"62:00:12\", filename: \"data/a\" }\n";
}

TEST(ClientStates, AreCountedByKind) {
  const ClientStates states = CountClientStates(Open(1, "12", "data/a") + Open(2, "13", "data/b") + Lock(3, "data/a") +
                                                    Lock(4, "data/b") + Lock(5, "data/b") + Delegation(6),
                                                kClientID);
  EXPECT_EQ(states.open_files, 2U);
  EXPECT_EQ(states.locks, 3U);
  EXPECT_EQ(states.delegations, 1U);
}

TEST(ClientStates, CountAFileOnceThatSeveralOwnersHaveOpen) {
  EXPECT_EQ(CountClientStates(Open(1, "12", "data/a") + Open(2, "12", "data/a"), kClientID).open_files, 1U);
}

TEST(ClientStates, CountAFileThatTheKernelDoesNotName) {
  const std::string line = ": { type: open, access: r-, deny: --, owner: \"open id:\" }\n";
  const std::string text = "- 0x" + StateID(1) + line + "- 0x" + StateID(2) + line;
  EXPECT_EQ(CountClientStates(text, kClientID).open_files, 2U);
}

// The kernel writes the name of a file as it is.
TEST(ClientStates, AreNotForgedByTheNameOfAFile) {
  const std::string names[] = {"a\", superblock: \"62:00:13\", filename: \"b",  // another file
                               "a\n",
                               "a\n- 0x1: { type: lock, ",
                               "a\" }\n" + Lock(1, "b"),                 // the id of a state that is there
                               "a\" }\n" + Open(9, "99", "b", kID + 1),  // the id of another client
                               "a\" }\n- 0x" + std::string(32, 'z') + ": { type: lock, superblock: \"",
                               "\" } - 0x" + StateID(8) + ": { type: lock, "};
  for (const std::string& name : names) {
    const ClientStates states = CountClientStates(Open(1, "12", name) + Open(2, "13", "c"), kClientID);
    EXPECT_EQ(states.open_files, 2U) << name;
    EXPECT_EQ(states.locks, 0U) << name;
  }
}

TEST(ClientStates, OfAnUnknownClientIDAreAllCounted) {
  EXPECT_EQ(CountClientStates(Lock(1, "a"), "").locks, 1U);
  EXPECT_EQ(CountClientStates(Lock(1, "a"), "nonsense").locks, 1U);
}

TEST(ClientStates, AreNoneInTextOfAnotherForm) {
  for (const char* text : {"", "\n\n", "- 0x", "- 0x0123: { type: lock }", "noise", "- 0x\n- \n-"}) {
    const ClientStates states = CountClientStates(text, kClientID);
    EXPECT_EQ(states.open_files + states.locks + states.delegations, 0U) << text;
  }
}

// Every cut of a text is read without harm.
TEST(ClientStates, AreReadFromACutText) {
  const std::string text = Open(1, "12", "data/a") + Lock(2, "data/a");
  for (std::size_t size = 0; size < text.size(); ++size) {
    EXPECT_LE(CountClientStates(text.substr(0, size), kClientID).open_files, 1U) << size;
  }
}

}  // namespace
}  // namespace vorn

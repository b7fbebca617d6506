#include "api_table.h"

#include <gtest/gtest.h>

#include <cstring>
#include <stdexcept>
#include <string>
#include <vector>

#include "fake_platform.h"

namespace {

struct Row {
  const char* api;
  int version;
  const char* method;
};

constexpr Row kRows[] = {
    {"VORN.Core.FileServ.NFS", 1, "get"},
    {"VORN.Core.FileServ.NFS", 1, "set"},
    {"VORN.Core.FileServ.NFS", 2, "get"},
    {"VORN.Core.FileServ.NFS", 2, "set"},
};

TEST(APITable, IsTheSameAtEveryCall) {
  EXPECT_EQ(GetAPITable(), GetAPITable());
  EXPECT_EQ(GetAPITable(), static_cast<const void*>(gTable));
}

TEST(APITable, HoldsTheRowsInTheirOrderAndEndsWithZeros) {
  const APIRow* row = gTable;
  for (const Row& expected : kRows) {
    ASSERT_NE(row->api, nullptr) << expected.api;
    EXPECT_STREQ(row->api, expected.api);
    EXPECT_EQ(row->version, expected.version);
    EXPECT_STREQ(row->method, expected.method);
    EXPECT_NE(row->handler, nullptr);
    ++row;
  }
  EXPECT_EQ(row->api, nullptr);
  EXPECT_EQ(row->version, 0);
  EXPECT_EQ(row->method, nullptr);
  EXPECT_EQ(row->handler, nullptr);
}

TEST(APITable, HasAnEntryFunctionOfItsOwnForEveryRow) {
  std::vector<void (*)(VORN::APIRequest*, VORN::APIResponse*)> seen;
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    EXPECT_EQ(std::count(seen.begin(), seen.end(), row->handler), 0) << row->api << ' ' << row->method;
    seen.push_back(row->handler);
  }
}

TEST(EntryFunctions, AnswerExactlyOnce) {
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    FakePlatform platform;
    EXPECT_EQ(Call(row->handler, "{}").count, 1) << row->api << ' ' << row->method;
    EXPECT_TRUE(platform.live_objects.empty()) << row->api << ' ' << row->method;
  }
}

TEST(EntryFunctions, LetAnExceptionPassAndLeaveNothingBehind) {
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    for (const char* thrower : {"GetParam", "SetSuccess", "SetError"}) {
      FakePlatform platform;
      platform.Throw(thrower);
      try {
        Call(row->handler, R"({"enable_nfs": false})");
      } catch (const std::runtime_error& error) {
        EXPECT_STREQ(error.what(), "thrown on demand");
        EXPECT_EQ(platform.calls.back().rfind(thrower, 0), 0U) << "nothing is called after " << thrower;
      }
      EXPECT_TRUE(platform.live_objects.empty()) << row->api << ' ' << row->method << ' ' << thrower;
    }
  }
}

}  // namespace

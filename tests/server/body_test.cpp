#include "body.h"

#include <gtest/gtest.h>

#include <memory>

#include "settings.h"

namespace vorn::server {
namespace {

std::variant<Json::Value, Response> Read(const std::string& text) {
  Budget memory(std::size_t{1} << 30, std::size_t{1} << 30);
  JsonBody body(memory);
  for (const char c : text) EXPECT_FALSE(body.Receive(std::string_view(&c, 1)));
  return body.TakeParameters();
}

TEST(JsonBody, IsOneObjectHoweverItComes) {
  const auto parameters = Read(R"({"enable_nfs": true})");
  ASSERT_TRUE(std::holds_alternative<Json::Value>(parameters));
  EXPECT_EQ(std::get<Json::Value>(parameters)["enable_nfs"], true);
}

TEST(JsonBody, WithoutBytesIsAnEmptyObject) {
  EXPECT_EQ(std::get<Json::Value>(Read("")), Json::Value(Json::objectValue));
}

TEST(JsonBody, ThatIsNoObjectIsRefusedWithTheReason) {
  const auto parameters = Read("{\"a\"");
  ASSERT_TRUE(std::holds_alternative<Response>(parameters));
  EXPECT_EQ(std::get<Response>(parameters).status, 400);
  EXPECT_NE(std::get<Response>(parameters).body.find("Line 1, Column"), std::string::npos);
}

TEST(JsonBody, CannotNameAPathOfTheServer) {
  for (const char* name : {"keytab_file_tmp", "_tmp"}) {
    const auto parameters = Read(std::string("{\"") + name + "\": \"/etc/passwd\"}");
    ASSERT_TRUE(std::holds_alternative<Response>(parameters)) << name;
    EXPECT_EQ(std::get<Response>(parameters).status, 400);
  }
  EXPECT_TRUE(std::holds_alternative<Json::Value>(Read(R"({"tmp": "x", "a": {"b_tmp": 1}})")));
}

TEST(JsonBody, HasALimit) {
  Budget memory(0, 0);
  JsonBody body(memory);
  EXPECT_FALSE(body.Receive(std::string(JsonBody::kMaxBytes, ' ')));
  const auto refusal = body.Receive(" ");
  ASSERT_TRUE(refusal);
  EXPECT_EQ(refusal->status, 413);
}

TEST(JsonBody, OccupiesTheMemoryOfItsDeclaredLengthAndNoMore) {
  Budget memory(0, 0);
  JsonBody body(memory);
  body.Announce(300000);
  EXPECT_LT(body.memory(), 100U) << "before anything has arrived";
  for (int i = 0; i < 300; ++i) EXPECT_FALSE(body.Receive(std::string(1000, ' ')));
  EXPECT_EQ(body.memory(), 300000U);
}

TEST(JsonBody, DoesNotTrustTheDeclaredLength) {
  Budget memory(0, 0);
  JsonBody body(memory);
  body.Announce(UINT64_MAX);
  EXPECT_FALSE(body.Receive(" "));
  EXPECT_LE(body.memory(), JsonBody::kMaxBytes);
}

TEST(JsonBody, ChargesItsMemoryUntilItIsDestroyed) {
  Budget memory(8000, 8000);
  auto first = std::make_unique<JsonBody>(memory);
  EXPECT_FALSE(first->Receive(R"({"a": [1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14]})"));
  EXPECT_TRUE(std::holds_alternative<Json::Value>(first->TakeParameters()));
  EXPECT_GT(memory.used(), 0U);
  JsonBody second(memory);
  EXPECT_FALSE(second.Receive(R"({"a": [1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14]})"));
  const auto refused = second.TakeParameters();
  ASSERT_TRUE(std::holds_alternative<Response>(refused));
  EXPECT_EQ(std::get<Response>(refused).status, 503);
  first.reset();
  EXPECT_EQ(memory.used(), 0U);
  EXPECT_TRUE(std::holds_alternative<Json::Value>(second.TakeParameters()));
}

TEST(JsonBody, ThatNeverFitsIntoTheBudgetIsTooLarge) {
  Budget memory(1000, 1000);
  JsonBody body(memory);
  EXPECT_FALSE(body.Receive(R"({"a": [1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14]})"));
  const auto refused = body.TakeParameters();
  ASSERT_TRUE(std::holds_alternative<Response>(refused));
  EXPECT_EQ(std::get<Response>(refused).status, 413);
}

// The n-th of 185,193 short keys.
std::string Key(int n) {
  std::string key;
  for (int i = 0; i < 3; ++i, n /= 57) key += static_cast<char>('#' + n % 57);
  return key;
}

// The bodies that cost most: all values are arrays with a key, or strings with a key.
TEST(JsonBody, OfEveryKindFitsIntoTheDefaultBudget) {
  EXPECT_LE(JsonBody::kMaxCharge, Settings().parameter_memory.bytes);
  for (const char* value : {"[]", "\"\""}) {
    std::string text = "{";
    for (int i = 1; i < 100000; ++i) text += "\"" + Key(i) + "\":" + value + ",";
    text.back() = '}';
    Budget memory(JsonBody::kMaxCharge, JsonBody::kMaxCharge);
    JsonBody body(memory);
    text.resize(JsonBody::kMaxBytes, ' ');
    EXPECT_FALSE(body.Receive(text));
    EXPECT_TRUE(std::holds_alternative<Json::Value>(body.TakeParameters())) << value;
    EXPECT_GT(memory.used(), JsonBody::kMaxCharge * 4 / 5) << "the bound is not much larger than what can be charged";
  }
}

}  // namespace
}  // namespace vorn::server

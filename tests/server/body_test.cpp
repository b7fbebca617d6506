#include "body.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

std::variant<Json::Value, Response> Read(const std::string& text) {
  JsonBody body;
  for (const char c : text) EXPECT_FALSE(body.Receive(std::string_view(&c, 1)));
  return body.TakeParameters();
}

TEST(JsonBody, IsOneObjectHoweverItComes) {
  const auto parameters = Read(R"({"enable_nfs": true})");
  ASSERT_TRUE(std::holds_alternative<Json::Value>(parameters));
  EXPECT_EQ(std::get<Json::Value>(parameters)["enable_nfs"], true);
}

TEST(JsonBody, WithoutABytesIsAnEmptyObject) {
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
  JsonBody body;
  EXPECT_FALSE(body.Receive(std::string(JsonBody::kMaxBytes, ' ')));
  const auto refusal = body.Receive(" ");
  ASSERT_TRUE(refusal);
  EXPECT_EQ(refusal->status, 413);
}

}  // namespace
}  // namespace vorn::server

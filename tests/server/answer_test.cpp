#include "answer.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

TEST(Answer, SuccessCarriesTheData) {
  Json::Value data;
  data["enable_nfs"] = true;
  EXPECT_EQ(Success(data).status, 200);
  EXPECT_EQ(Success(data).body, R"({"success":true,"data":{"enable_nfs":true}})");
}

TEST(Answer, SuccessWithoutDataSaysNull) { EXPECT_EQ(Success({}).body, R"({"success":true,"data":null})"); }

TEST(Answer, FailureCarriesCodeTextAndDetails) {
  const Response response = Failure(409, 2351, "Mapped \"already\".", Json::Value("alice"));
  EXPECT_EQ(response.status, 409);
  EXPECT_EQ(response.body, R"({"success":false,"error":{"code":2351,"text":"Mapped \"already\".","details":"alice"}})");
}

TEST(Answer, FailureWithoutDetailsLeavesThemOut) {
  EXPECT_EQ(Failure(500, 2302, "No.").body, R"({"success":false,"error":{"code":2302,"text":"No."}})");
}

TEST(Answer, RefusalHasTheStatusForItsCode) {
  EXPECT_EQ(Refusal(404, "Unknown.").status, 404);
  EXPECT_EQ(Refusal(404, "Unknown.").body, R"({"success":false,"error":{"code":404,"text":"Unknown."}})");
}

TEST(Answer, TextThatIsNoUtf8StillMakesValidJson) {
  for (const char byte : Success(Json::Value("\xff\xc3")).body) EXPECT_LT(static_cast<unsigned char>(byte), 0x80);
}

}  // namespace
}  // namespace vorn::server

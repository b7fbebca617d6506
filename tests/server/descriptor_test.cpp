#include "descriptor.h"

#include <gtest/gtest.h>

#include "sandbox.h"

namespace vorn::server {
namespace {

TEST(Descriptor, GivesStatusAndTextOfACode) {
  std::string error;
  const auto descriptor = Descriptor::Parse(
      R"({"openapi": "3.1.0", "x-error-codes": {"2301": {"status": 400, "text": "Wrong."}}})", &error);
  ASSERT_TRUE(descriptor) << error;
  EXPECT_EQ(descriptor->Describe(2301).status, 400);
  EXPECT_EQ(descriptor->Describe(2301).text, "Wrong.");
}

TEST(Descriptor, HasAPlainTextForCodesItDoesNotKnow) {
  EXPECT_EQ(Descriptor().Describe(2399).status, 500);
  EXPECT_EQ(Descriptor().Describe(2399).text, "The operation failed with error code 2399.");
}

TEST(Descriptor, WithoutCodesIsStillOne) {
  std::string error;
  EXPECT_TRUE(Descriptor::Parse("{}", &error)) << error;
}

TEST(Descriptor, IsRefusedWhenFaulty) {
  for (const char* json :
       {"", "[]", "{", R"({"x-error-codes": []})", R"({"x-error-codes": {"a": {"status": 400, "text": "x"}}})",
        R"({"x-error-codes": {"1x": {"status": 400, "text": "x"}}})",
        R"({"x-error-codes": {"0": {"status": 400, "text": "x"}}})", R"({"x-error-codes": {"1": 400}})",
        R"({"x-error-codes": {"1": {"text": "x"}}})", R"({"x-error-codes": {"1": {"status": 200, "text": "x"}}})",
        R"({"x-error-codes": {"1": {"status": 600, "text": "x"}}})",
        R"({"x-error-codes": {"1": {"status": 400, "text": 1}}})"}) {
    std::string error;
    EXPECT_FALSE(Descriptor::Parse(json, &error)) << json;
    EXPECT_NE(error, "") << json;
  }
}

TEST(Descriptor, OfTheNfsModuleCoversItsCodes) {
  std::string error;
  const auto descriptor = Descriptor::Parse(ReadWholeFile(NFS_DESCRIPTOR), &error);
  ASSERT_TRUE(descriptor) << error;
  for (const int code : {2301, 2302, 2303, 2330, 2331, 2332, 2351, 2352, 2353, 2370, 2371}) {
    EXPECT_EQ(descriptor->Describe(code).text.find("error code"), std::string::npos) << code;
  }
  EXPECT_EQ(descriptor->Describe(2301).status, 400);
  EXPECT_EQ(descriptor->Describe(2302).status, 500);
}

}  // namespace
}  // namespace vorn::server

#include "header_value.h"

#include <gmock/gmock.h>

namespace vorn::server {
namespace {

using testing::ElementsAre;
using testing::Pair;

TEST(HeaderValue, HasAValueAndParameters) {
  const auto header = ParseHeaderValue(R"( Multipart/Form-Data ;BOUNDARY=aB1 ; name="a \"b\" ;c")");
  ASSERT_TRUE(header);
  EXPECT_EQ(header->value, "multipart/form-data");
  EXPECT_THAT(header->parameters, ElementsAre(Pair("boundary", "aB1"), Pair("name", "a \"b\" ;c")));
}

TEST(HeaderValue, MayBeAlone) {
  EXPECT_EQ(ParseHeaderValue("application/json")->value, "application/json");
  EXPECT_TRUE(ParseHeaderValue("application/json")->parameters.empty());
  EXPECT_EQ(ParseHeaderValue("")->value, "");
}

TEST(HeaderValue, IsRefusedWhenMalformed) {
  for (const char* text : {"a;", "a;b", "a;b=", "a;=c", "a;b=\"c", "a;b=\"c\\", "a;b=c d", "a;b=1;b=2", "a;b=\"c\"d"}) {
    EXPECT_FALSE(ParseHeaderValue(text)) << text;
  }
}

TEST(HeaderValue, BlanksAreTrimmedAtBothEnds) {
  EXPECT_EQ(TrimBlanks(" \t a b \t"), "a b");
  EXPECT_EQ(TrimBlanks(" \t"), "");
}

}  // namespace
}  // namespace vorn::server

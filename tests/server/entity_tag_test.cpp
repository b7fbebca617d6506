#include "entity_tag.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

Json::Value Page(int offset) {
  Json::Value parameters;
  parameters["filter"] = "ü\"";
  parameters["offset"] = offset;
  return parameters;
}

TEST(EntityTag, DependsOnDataAndParameters) {
  const auto tag = MakeEntityTag(Page(0), "[1]");
  ASSERT_TRUE(tag);
  EXPECT_EQ(MakeEntityTag(Page(0), "[1]"), tag);
  EXPECT_NE(MakeEntityTag(Page(0), "[2]"), tag);
  EXPECT_NE(MakeEntityTag(Page(1), "[1]"), tag);
}

TEST(EntityTag, HasOnlyCharactersOfATag) {
  const auto tag = MakeEntityTag(Page(0), "[1]");
  ASSERT_TRUE(tag);
  EXPECT_EQ(tag->front(), '"');
  EXPECT_EQ(tag->find('"', 1), tag->size() - 1);
  EXPECT_EQ(tag->find_first_of(" ,\\"), std::string::npos);
}

TEST(EntityTag, GivesItsParametersBack) {
  EXPECT_EQ(ParametersOfTag(*MakeEntityTag(Page(7), "x")), Page(7));
  EXPECT_EQ(ParametersOfTag(*MakeEntityTag(Json::Value(), "x")), Json::Value(Json::objectValue));
  EXPECT_EQ(MakeEntityTag(Json::Value(Json::objectValue), "x"), MakeEntityTag(Json::Value(), "x"));
}

TEST(EntityTag, OfLargeParametersIsNotMade) {
  Json::Value parameters;
  parameters["filter"] = std::string(kMaxTaggedParameters, 'a');
  EXPECT_FALSE(MakeEntityTag(parameters, "x"));
}

TEST(EntityTag, OfSomebodyElseHasNoParameters) {
  for (const char* tag : {"", "\"", "abc", "\"abc.x\"", "\"abc.!!!!\"", "\"abc.====\"", "\"abc.W10=\"", "W/\"abc\""}) {
    EXPECT_FALSE(ParametersOfTag(tag)) << tag;
  }
}

TEST(IfMatchHeader, NamesStrongTags) {
  EXPECT_EQ(ParseIfMatch("\"a\", W/\"b\",\"c-gzip\" , d").tags, (std::vector<std::string>{"\"a\"", "\"c\""}));
  EXPECT_FALSE(ParseIfMatch("\"*\"").any);
  EXPECT_TRUE(ParseIfMatch(" * ").any);
}

TEST(IfMatchHeader, IsReadUpToALimit) {
  std::string many;
  for (int i = 0; i < 100; ++i) many += "\"a\",";
  EXPECT_EQ(ParseIfMatch(many).tags.size(), kMaxTags);
}

}  // namespace
}  // namespace vorn::server

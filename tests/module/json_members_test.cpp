#include "json_members.h"

#include <gtest/gtest.h>

#include <array>
#include <string>
#include <string_view>

namespace {

using Members = std::array<const Json::Value*, 3>;

// Returns the members "port", "name" and "a".
Members Find(const Json::Value& object) {
  constexpr std::array<std::string_view, 3> kNames = {"port", "name", "a"};
  Members members{};
  FindMembers(object, kNames.begin(), kNames.end(), members.data());
  return members;
}

TEST(FindMembers, ReturnsTheMembersInTheOrderOfTheNames) {
  Json::Value object;
  object["name"] = "box";
  object["port"] = 2049;
  object["a"] = true;
  const Members members = Find(object);
  EXPECT_EQ(members[0], &object["port"]);
  EXPECT_EQ(members[1], &object["name"]);
  EXPECT_EQ(members[2], &object["a"]);
}

TEST(FindMembers, ReturnsTheNullValueForAnAbsentMember) {
  Json::Value object;
  object["name"] = Json::Value();
  const Members members = Find(object);
  EXPECT_TRUE(members[0]->isNull());
  EXPECT_EQ(members[1], &object["name"]);
  EXPECT_TRUE(members[2]->isNull());
}

TEST(FindMembers, TakesNoLongerOrShorterName) {
  Json::Value object;
  for (const char* name : {"por", "port2", "names", "nam", "", "aa"}) object[name] = 1;
  object[std::string("a\0", 2)] = 1;
  for (const Json::Value* member : Find(object)) EXPECT_TRUE(member->isNull());
}

TEST(FindMembers, FindsNothingInNull) {
  for (const Json::Value* member : Find(Json::Value())) EXPECT_TRUE(member->isNull());
}

TEST(FindMembers, ThrowsForAValueWithoutMembers) {
  EXPECT_THROW(Find(Json::Value(Json::arrayValue)), Json::LogicError);
  EXPECT_THROW(Find(Json::Value("port")), Json::LogicError);
}

}  // namespace

#include "folder_permissions.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace vorn {
namespace {

// An entry of an access control list, as the kernel lays it out on every machine: little-endian.
std::string Entry(unsigned tag, unsigned permissions, std::uint32_t id) {
  std::string text = {static_cast<char>(tag), '\0', static_cast<char>(permissions), '\0'};
  for (unsigned shift = 0; shift < 32; shift += 8) text.push_back(static_cast<char>(id >> shift & 0xff));
  return text;
}

VORN::AccessIdentity User(std::uint32_t user, std::uint32_t group, std::vector<std::uint32_t> groups = {}) {
  VORN::AccessIdentity identity;
  identity.user_id = user;
  identity.group_id = group;
  identity.groups = std::move(groups);
  return identity;
}

constexpr unsigned kAll = 7;

TEST(FolderPermissions, AreThoseOfTheFirstClassThatTheUserIsIn) {
  const FolderPermissions folder{2001, 50, 0751, ""};
  EXPECT_EQ(folder.Of(User(2001, 50), kAll), 7U);
  EXPECT_EQ(folder.Of(User(2002, 50), kAll), 5U);
  EXPECT_EQ(folder.Of(User(2002, 2002, {7, 50}), kAll), 5U);
  EXPECT_EQ(folder.Of(User(2002, 2002), kAll), 1U);
  EXPECT_EQ(folder.Of(User(2002, 2002), 4), 0U);
}

TEST(FolderPermissions, KeepNothingFromRoot) {
  EXPECT_EQ((FolderPermissions{2001, 50, 0, ""}.Of(User(0, 0), kAll)), kAll);
}

TEST(FolderPermissions, FollowAnAccessControlList) {
  const std::string acl = std::string("\x02\0\0\0", 4) + Entry(0x01, 7, ~0U) + Entry(0x02, 7, 2002) +
                          Entry(0x04, 4, ~0U) + Entry(0x08, 1, 60) + Entry(0x08, 7, 70) + Entry(0x10, 5, ~0U) +
                          Entry(0x20, 0, ~0U);
  const FolderPermissions folder{2001, 50, 0770, acl};
  EXPECT_EQ(folder.Of(User(2001, 50), kAll), 7U) << "the mask does not concern the owner";
  EXPECT_EQ(folder.Of(User(2002, 1), kAll), 5U) << "a named user within the mask";
  EXPECT_EQ(folder.Of(User(2003, 50), kAll), 4U) << "the folder's group";
  EXPECT_EQ(folder.Of(User(2003, 70), kAll), 5U) << "a named group within the mask";
  EXPECT_EQ(folder.Of(User(2003, 50, {60}), 5), 4U) << "no entry has both permissions";
  EXPECT_EQ(folder.Of(User(2003, 50, {70}), 5), 5U) << "one entry has both";
  EXPECT_EQ(folder.Of(User(2003, 1), kAll), 0U) << "everybody else";
}

}  // namespace
}  // namespace vorn

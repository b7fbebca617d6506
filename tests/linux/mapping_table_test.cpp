#include "mapping_table.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>

#include "mapping_file.h"
#include "temporary_root.h"

namespace {

using vorn::Mappings;
using vorn::MappingTable;

constexpr char kFile[] = "/mappings";

std::optional<std::string> Find(const MappingTable& table, std::string_view principal) {
  const std::optional<std::string_view> name = table.Find(principal);
  return name ? std::optional<std::string>(*name) : std::nullopt;
}

TEST(MappingTable, FindsEachMappingWithoutRegardToCase) {
  const std::optional<MappingTable> table = MappingTable::Parse(vorn::RenderMappingTable(
      {{"bob@X", "Bob"}, {"Alice@X", "alice"}, {"nfs/box@X", "root"}, {"a", "empty name follows"}, {"b", ""}}));
  ASSERT_TRUE(table.has_value());
  const struct {
    const char* principal;
    std::optional<std::string> name;
  } cases[] = {{"bob@X", "Bob"},      {"BOB@x", "Bob"},   {"alice@x", "alice"},    {"nfs/box@X", "root"},     {"b", ""},
               {"bob", std::nullopt}, {"", std::nullopt}, {"zoe@X", std::nullopt}, {"alice@X ", std::nullopt}};
  for (const auto& c : cases) EXPECT_EQ(Find(*table, c.principal), c.name) << c.principal;
}

TEST(MappingTable, HasTheFirstOfTwoPrincipalsThatDifferOnlyInCase) {
  const auto table = MappingTable::Parse(vorn::RenderMappingTable({{"b@X", "one"}, {"a@X", "two"}, {"B@x", "three"}}));
  ASSERT_TRUE(table.has_value());
  EXPECT_EQ(Find(*table, "b@X"), "one");
}

TEST(MappingTable, MayBeEmpty) {
  const auto table = MappingTable::Parse(vorn::RenderMappingTable({}));
  ASSERT_TRUE(table.has_value());
  EXPECT_EQ(Find(*table, "a@X"), std::nullopt);
}

TEST(MappingTable, IsRefusedUnlessItIsComplete) {
  const std::string text = vorn::RenderMappingTable({{"a@X", "nobody"}, {"b@X", "daemon"}});
  for (std::size_t length = 0; length < text.size(); ++length) {
    EXPECT_FALSE(MappingTable::Parse(text.substr(0, length)).has_value()) << length;
  }
  const std::string zero(1, '\0');
  for (const std::string& bad :
       {text + "x", "vorn-idmap 2 0\n" + std::string(), "vorn-idmap 1 1\na@X\n" + std::string(),
        "vorn-idmap 1 2\nb" + zero + "x\na" + zero + "x\n"}) {
    EXPECT_FALSE(MappingTable::Parse(bad).has_value()) << bad;
  }
}

// The table as Store::Replace writes it: the file at the path is exchanged.
void Replace(const TemporaryRoot& root, const std::string& text) {
  root.Write("/new", text);
  ASSERT_EQ(std::rename(root.At("/new").c_str(), root.At(kFile).c_str()), 0);
}

TEST(MappingFile, IsReadAgainWhenItIsReplaced) {
  const TemporaryRoot root;
  vorn::MappingFile file(root.At(kFile));
  int error = -1;
  EXPECT_EQ(file.Current(&error), nullptr);
  EXPECT_EQ(error, 0);
  for (const char* name : {"nobody", "daemon"}) {
    Replace(root, vorn::RenderMappingTable({{"a@X", name}}));
    const MappingTable* table = file.Current(&error);
    ASSERT_NE(table, nullptr);
    EXPECT_EQ(Find(*table, "a@X"), name);
  }
}

// The number of a removed file's inode is soon given to another one, which may have the same size and be of the same
// moment.
TEST(MappingFile, KeepsTheInodeOfItsTableFromBeingUsedAgain) {
  const TemporaryRoot root;
  Replace(root, vorn::RenderMappingTable({{"a@X", "nobody"}}));
  vorn::MappingFile file(root.At(kFile));
  int error = -1;
  ASSERT_NE(file.Current(&error), nullptr);
  struct stat read {};
  ASSERT_EQ(stat(root.At(kFile).c_str(), &read), 0);
  for (int i = 0; i < 100; ++i) {
    Replace(root, vorn::RenderMappingTable({{"a@X", "daemon"}}));
    struct stat now {};
    ASSERT_EQ(stat(root.At(kFile).c_str(), &now), 0);
    ASSERT_NE(now.st_ino, read.st_ino);
  }
}

TEST(MappingFile, StaysInForceWhenItDisappearsAndNotWhenItIsDamaged) {
  const TemporaryRoot root;
  Replace(root, vorn::RenderMappingTable({{"a@X", "nobody"}}));
  vorn::MappingFile file(root.At(kFile));
  int error = -1;
  ASSERT_NE(file.Current(&error), nullptr);
  std::remove(root.At(kFile).c_str());
  EXPECT_NE(file.Current(&error), nullptr);
  Replace(root, "vorn-idmap 1 1\n");
  EXPECT_EQ(file.Current(&error), nullptr);
  EXPECT_EQ(error, EBADMSG);
}

}  // namespace

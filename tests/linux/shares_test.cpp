#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "core.h"
#include "share.h"
#include "temporary_root.h"

namespace {

// Returns the path of a share, or the error code as a string.
std::string PathOf(const char* name) {
  VORNSHARE* share = nullptr;
  if (VORNShareGet(name, &share) < 0) {
    EXPECT_EQ(share, nullptr) << name;
    return std::to_string(KLIBCErrGet());
  }
  const std::string path = KLIBSharePathGet(share);
  VORNShareFree(share);
  return path;
}

const std::string kNone = std::to_string(ENOENT);

TEST(VORNShareGet, FindsAShareByItsExactName) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/shares.conf", "# ours\n[shares]\ndata = /volume1/data\nmy files = /volume1/my files\n");
  EXPECT_EQ(PathOf("data"), "/volume1/data");
  EXPECT_EQ(PathOf("my files"), "/volume1/my files");
  for (const char* other : {"Data", "dat", "data ", "", "shares"}) EXPECT_EQ(PathOf(other), kNone) << other;
}

TEST(VORNShareGet, FindsNothingWithoutAFile) {
  const TemporaryRoot root;
  EXPECT_EQ(PathOf("data"), kNone);
}

TEST(VORNShareGet, GivesAPathWithoutLinksAndDotsInsideTheRoot) {
  const TemporaryRoot root;
  root.Write("/volume1/data/file", "");
  ASSERT_EQ(symlink("/volume1/data", root.At("/link").c_str()), 0);
  ASSERT_EQ(symlink("../../../../etc", root.At("/out").c_str()), 0);
  root.Write("/etc/vorn/shares.conf", "[shares]\na = /link\nb = /volume1/../volume1//data/\nc = /out\nd = /../../x\n");
  EXPECT_EQ(PathOf("a"), "/volume1/data");
  EXPECT_EQ(PathOf("b"), "/volume1/data");
  EXPECT_EQ(PathOf("c"), "/etc");
  EXPECT_EQ(PathOf("d"), "/x");
}

TEST(VORNShareGet, RefusesAPathThatIsNotAbsolute) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/shares.conf", "[shares]\na = volume1\n");
  EXPECT_NE(PathOf("a"), kNone);
  EXPECT_NE(PathOf("a"), "volume1");
}

TEST(VORNShareGet, RefusesAPathThatAnExportRuleListWouldCut) {
  const TemporaryRoot root;
  const std::string longest = "/" + std::string(250, 'a') + "/" + std::string(255, 'b');
  root.Write("/etc/vorn/shares.conf", "[shares]\nfits = " + longest + "\nlong = " + longest + "c\n");
  EXPECT_EQ(PathOf("fits"), longest);
  EXPECT_EQ(PathOf("long"), std::to_string(ENAMETOOLONG));
}

TEST(VORNShareFree, TakesNull) { VORNShareFree(nullptr); }

}  // namespace

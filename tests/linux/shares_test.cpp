#include <gtest/gtest.h>
#include <unistd.h>

#include <cerrno>
#include <string>

#include "core.h"
#include "share.h"
#include "shared_folders.h"
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

// "name=path " for each share.
std::string AllShares() {
  KLIBSZHASH* hash = KLIBCSzHashAlloc(0);
  KLIBSZLIST* names = KLIBCSzListAlloc(0);
  EXPECT_GE(VORNShareEnum(&hash), 0);
  KLIBCSzHashEnumKey(hash, &names);
  std::string all;
  for (int i = 0; i < names->count; ++i) {
    const char* const name = KLIBCSzListGet(names, i);
    all += std::string(name) + "=" + KLIBCSzHashGetValue(hash, name) + " ";
  }
  KLIBCSzListFree(names);
  KLIBCSzHashFree(hash);
  return all;
}

// A root with the folder /volume1/data and an administrator's own file.
class SharesFile : public testing::Test {
 protected:
  SharesFile() {
    root.Write("/volume1/data/file", "");
    root.Write("/volume1/new/file", "");
    root.Write(kFile, kText);
  }

  const std::string kFile = "/etc/vorn/shares.conf";
  const std::string kText = "# ours\n[shares]\ndata = /volume1/data # the old one\n[other]\nx = y\n";
  TemporaryRoot root;
};

TEST_F(SharesFile, ListsEachNameOnce) {
  root.Write(kFile, "[shares]\na = /volume1/data\nrelative = volume1\nb = /volume1/../volume1//new/\n");
  EXPECT_EQ(AllShares(), "a=/volume1/data relative=volume1 b=/volume1/new ");
}

TEST_F(SharesFile, KeepsEverythingElse) {
  EXPECT_EQ(VORNShareCreate("new", "/volume1/new"), 0);
  EXPECT_EQ(root.Read(kFile),
            "# ours\n[shares]\ndata = /volume1/data # the old one\nnew = /volume1/new\n[other]\nx = y\n");
  EXPECT_EQ(PathOf("new"), "/volume1/new");
  EXPECT_EQ(VORNShareDelete("new"), 0);
  EXPECT_EQ(root.Read(kFile), kText);
}

TEST_F(SharesFile, IsMadeForTheFirstShare) {
  const TemporaryRoot empty;
  empty.Write("/volume1/data/file", "");
  EXPECT_EQ(AllShares(), "");
  EXPECT_EQ(VORNShareCreate("data", "/volume1/data"), 0);
  EXPECT_EQ(AllShares(), "data=/volume1/data ");
}

TEST_F(SharesFile, GetsThePathWithoutLinks) {
  ASSERT_EQ(symlink("/volume1/new", root.At("/link").c_str()), 0);
  EXPECT_EQ(VORNShareCreate("linked", "/link/../new/."), 0);
  EXPECT_EQ(PathOf("linked"), "/volume1/new");
}

TEST_F(SharesFile, RefusesANameOrAPathThatIsTaken) {
  for (const char* name : {"data", "DATA"}) EXPECT_EQ(VORNShareCreate(name, "/volume1/new"), VORNSHARE_EXISTS) << name;
  for (const char* path : {"/volume1/data", "/volume1//data/", "/volume1/new/../data"}) {
    EXPECT_EQ(VORNShareCreate("other", path), VORNSHARE_EXISTS) << path;
  }
  EXPECT_EQ(root.Read(kFile), kText);
}

TEST_F(SharesFile, RefusesWhatIsNoFolder) {
  for (const char* path : {"/volume1/none", "/volume1/data/file", "/volume1/data/file/x"}) {
    EXPECT_EQ(VORNShareCreate("other", path), VORNSHARE_NO_FOLDER) << path;
  }
  for (const std::string& path : {std::string("volume1"), std::string(""), std::string("/"), std::string("/volume1/.."),
                                  "/" + std::string(600, 'x')}) {
    EXPECT_EQ(VORNShareCreate("other", path.c_str()), VORNSHARE_FAILED) << path;
  }
  EXPECT_EQ(root.Read(kFile), kText);
}

TEST_F(SharesFile, RefusesNamesThatItCannotRepresent) {
  for (const std::string& name : {std::string("a=b"), std::string("[a]"), std::string("#a"), std::string("a\nb"),
                                  std::string(" a"), std::string("a "), std::string(""), std::string("include"),
                                  std::string(".a"), std::string("a/b"), std::string(256, 'a')}) {
    EXPECT_EQ(VORNShareCreate(name.c_str(), "/volume1/new"), VORNSHARE_FAILED) << name;
  }
  EXPECT_EQ(root.Read(kFile), kText);
  EXPECT_EQ(VORNShareCreate("m\xc3\xbcsik & co", "/volume1/new"), 0);
  EXPECT_EQ(PathOf("m\xc3\xbcsik & co"), "/volume1/new");
}

TEST_F(SharesFile, DeletesTheExactNameOnly) {
  for (const char* name : {"Data", "none", "x", ""}) EXPECT_EQ(VORNShareDelete(name), VORNSHARE_NO_SHARE) << name;
  EXPECT_EQ(root.Read(kFile), kText);
}

TEST(VORNShareEnum, RefusesNull) {
  EXPECT_LT(VORNShareEnum(nullptr), 0);
  EXPECT_EQ(VORNShareCreate(nullptr, "/a"), VORNSHARE_FAILED);
  EXPECT_EQ(VORNShareCreate("a", nullptr), VORNSHARE_FAILED);
  EXPECT_EQ(VORNShareDelete(nullptr), VORNSHARE_FAILED);
}

}  // namespace

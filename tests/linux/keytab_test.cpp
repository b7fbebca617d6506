// The contract's operations on keytabs.
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>

#include "call.h"
#include "core.h"
#include "current_box.h"
#include "keytab_maker.h"
#include "nfsconf.h"
#include "status.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;

constexpr char kInstalled[] = "/etc/nfs/krb5.keytab";
constexpr char kUpload[] = "/upload";

std::string StoredPrincipal() {
  NFSConfRecord record;
  return VORNNFSConfGet(&record) < 0 ? "no record" : record.kerberos_principal;
}

class KeytabImport : public testing::Test {
 protected:
  int Import(const std::string& content) {
    root_.Write(kUpload, content);
    return VORNNFSKeytabImport(root_.At(kUpload).c_str());
  }

  unsigned InstalledMode() const {
    struct stat info {};
    return stat(root_.At(kInstalled).c_str(), &info) == 0 ? info.st_mode & 07777U : 0;
  }

  const TemporaryRoot root_;
  const std::string good_ = EncodeFile({EncodeEntry("alice", "LAB.TEST", 17)});
};

TEST_F(KeytabImport, InstallsTheFileAsItIsForRootAlone) {
  const std::string content = MakeKeytabOfARealm();
  EXPECT_EQ(Import(content), 0);
  EXPECT_EQ(root_.Read(kInstalled), content);
  EXPECT_EQ(InstalledMode(), 0600U);
  EXPECT_EQ(root_.Read(kUpload), content) << "the caller's file is the caller's to remove";
  EXPECT_THAT(root_.Names("/etc/nfs"), ElementsAre("krb5.keytab"));
}

TEST_F(KeytabImport, OfACallReadsItsUploadsOnThisSystemAndAllElseBelowTheRoot) {
  root_.Write(kUpload, good_);
  VORN::CallDescription description;
  {
    const VORN::CallContext call(description);
    EXPECT_LT(VORNNFSKeytabImport(root_.At(kUpload).c_str()), 0) << "no upload of the call";
    EXPECT_EQ(KLIBCErrGet(), ENOENT);
    EXPECT_EQ(VORNNFSKeytabImport(kUpload), 0) << "a file of the box";
  }
  description.uploads = {root_.At(kUpload)};
  const VORN::CallContext call(description);
  EXPECT_EQ(VORNNFSKeytabImport(root_.At(kUpload).c_str()), 0);
}

TEST_F(KeytabImport, StoresTheNfsServicesPrincipal) {
  EXPECT_EQ(Import(MakeKeytabOfARealm()), 0);
  EXPECT_EQ(StoredPrincipal(), "nfs/box.example@LAB.TEST");
}

TEST_F(KeytabImport, StoresTheFirstPrincipalWhereNoneIsTheNfsServices) {
  EXPECT_EQ(Import(EncodeFile({EncodeEntry("first", "R", 17), EncodeEntry("nfsd", "R", 17)})), 0);
  EXPECT_EQ(StoredPrincipal(), "first@R");
}

TEST_F(KeytabImport, LeavesTheOtherSettingsAlone) {
  NFSConfRecord record{};
  record.read_size = 65536;
  record.statd_port = 4000;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(Import(good_), 0);
  NFSConfRecord after{};
  ASSERT_EQ(VORNNFSConfGet(&after), 0);
  std::strcpy(record.kerberos_principal, "alice@LAB.TEST");
  EXPECT_EQ(std::memcmp(&after, &record, sizeof record), 0);
}

TEST_F(KeytabImport, ReplacesAnOlderKeytabWhoeverMayReadIt) {
  root_.Write(kInstalled, "old");
  ASSERT_EQ(chmod(root_.At(kInstalled).c_str(), 0644), 0);
  EXPECT_EQ(Import(good_), 0);
  EXPECT_EQ(root_.Read(kInstalled), good_);
  EXPECT_EQ(InstalledMode(), 0600U);
}

// A call with If-Match reads the keytab before it replaces it.
TEST_F(KeytabImport, ReplacesAKeytabThatTheContextHasRead) {
  ASSERT_EQ(Import(EncodeFile({EncodeEntry("former", "LAB.TEST", 17)})), 0);
  const VornConf configuration;
  ASSERT_TRUE(vorn::CurrentBox().Read(kInstalled).ok());
  EXPECT_EQ(Import(good_), 0);
  EXPECT_EQ(root_.Read(kInstalled), good_);
  root_.Write(kInstalled, "by hand");
  EXPECT_LT(Import(good_), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kChangedBehind);
  EXPECT_EQ(root_.Read(kInstalled), "by hand");
}

TEST_F(KeytabImport, WarnsOfAFormerKeyThatTheNewKeytabLacks) {
  const std::string next = EncodeEntry("alice", "LAB.TEST", 17, 2);
  ASSERT_EQ(Import(good_), 0);
  const struct {
    const char* name;
    std::string content;
    bool warns;
  } cases[] = {{"the same keytab", good_, false},
               {"the former key and a new one", EncodeFile({next, EncodeEntry("alice", "LAB.TEST", 17)}), false},
               {"the new key alone", EncodeFile({next}), true},
               {"the key of another principal", EncodeFile({EncodeEntry("bob", "LAB.TEST", 17, 2)}), true}};
  for (const auto& c : cases) {
    VORN::CallDescription description;
    description.uploads = {root_.At(kUpload)};
    const VORN::CallContext call(description);
    ASSERT_EQ(Import(c.content), 0) << c.name;
    EXPECT_EQ(call.warnings().size(), c.warns ? 1U : 0U) << c.name;
  }
}

TEST_F(KeytabImport, RefusesWhatIsNoKeytabAndKeepsTheOneThatIsThere) {
  ASSERT_EQ(Import(good_), 0);
  for (const std::string& content :
       {std::string(), std::string("nfs/box.example@LAB.TEST\n"), EncodeFile({}), good_.substr(0, good_.size() - 1)}) {
    EXPECT_EQ(Import(content), VORNNFS_KEYTAB_NO_KEYTAB) << content.size();
    EXPECT_EQ(KLIBCErrGet(), vorn::kNoKeytab);
    EXPECT_EQ(root_.Read(kInstalled), good_);
    EXPECT_EQ(StoredPrincipal(), "alice@LAB.TEST");
  }
}

TEST_F(KeytabImport, FailsOtherwiseWhereTheFileCannotBeTaken) {
  root_.Write("/good", good_);
  ASSERT_EQ(symlink(root_.At("/good").c_str(), root_.At("/link").c_str()), 0);
  ASSERT_EQ(mkfifo(root_.At("/pipe").c_str(), 0600), 0);
  std::vector<std::string> entries(40'000, EncodeEntry("alice", "LAB.TEST", 17));
  root_.Write("/large", EncodeFile(entries));
  const struct {
    const char* path;
    int code;
  } cases[] = {{"/missing", ENOENT}, {"/link", EINVAL}, {"/pipe", EINVAL}, {"", EINVAL}, {"/large", EFBIG}};
  for (const auto& c : cases) {
    EXPECT_EQ(VORNNFSKeytabImport(root_.At(c.path).c_str()), VORNNFS_KEYTAB_FAILED) << c.path;
    EXPECT_EQ(KLIBCErrGet(), c.code) << c.path;
  }
  EXPECT_FALSE(root_.Read(kInstalled).has_value());
}

TEST_F(KeytabImport, InstallsNothingWhosePrincipalTheSettingsCannotCarry) {
  for (const std::string& name :
       {std::string("$HOME"), std::string(514, 'a'), std::string("a'b\"c#d"), std::string("a\xe2\x80\xae")}) {
    EXPECT_EQ(Import(EncodeFile({EncodeEntry(name, "LAB.TEST", 17)})), VORNNFS_KEYTAB_FAILED) << name;
    EXPECT_EQ(KLIBCErrGet(), vorn::kRefusedText) << name;
    EXPECT_FALSE(root_.Read(kInstalled).has_value()) << name;
  }
}

TEST_F(KeytabImport, StoresNoPrincipalOfAKeytabThatCannotBeInstalled) {
  root_.Write("/etc/nfs", "a file, and no folder");
  EXPECT_EQ(Import(good_), VORNNFS_KEYTAB_FAILED);
  EXPECT_EQ(StoredPrincipal(), "");
}

struct FreeEntries {
  void operator()(KeytabEntry* list) const { VORNNFSKeytabInfoFree(list); }
};

TEST(KeytabInfo, ListsTheKeysInFileOrder) {
  const TemporaryRoot root;
  root.Write(kInstalled, MakeKeytab({{"nfs/box.example@LAB.TEST", 3, "aes256-cts-hmac-sha1-96"},
                                     {"alice@LAB.TEST", 300, "aes128-cts-hmac-sha1-96"}}));
  KeytabEntry* entries = nullptr;
  ASSERT_EQ(VORNNFSKeytabInfoGet(kInstalled, &entries), 0);
  const std::unique_ptr<KeytabEntry, FreeEntries> owned(entries);
  ASSERT_NE(entries, nullptr);
  EXPECT_EQ(entries->version, 3);
  EXPECT_STREQ(entries->principal, "nfs/box.example@LAB.TEST");
  EXPECT_STREQ(entries->enc_type, "aes256-cts-hmac-sha1-96");
  ASSERT_NE(entries->next, nullptr);
  EXPECT_EQ(entries->next->version, 300);
  EXPECT_STREQ(entries->next->principal, "alice@LAB.TEST");
  EXPECT_STREQ(entries->next->enc_type, "aes128-cts-hmac-sha1-96");
  EXPECT_EQ(entries->next->next, nullptr);
}

TEST(KeytabInfo, OfABoxWithoutKeysIsAnEmptyList) {
  const TemporaryRoot root;
  auto* entries = new KeytabEntry{};
  const std::unique_ptr<KeytabEntry, FreeEntries> before(entries);
  EXPECT_EQ(VORNNFSKeytabInfoGet(kInstalled, &entries), 0);
  EXPECT_EQ(entries, nullptr);
}

TEST(KeytabInfo, CutsAPrincipalThatTheRecordCannotCarry) {
  const TemporaryRoot root;
  root.Write(kInstalled, EncodeFile({EncodeEntry(std::string(600, 'a'), "R", 17)}));
  KeytabEntry* entries = nullptr;
  ASSERT_EQ(VORNNFSKeytabInfoGet(kInstalled, &entries), 0);
  const std::unique_ptr<KeytabEntry, FreeEntries> owned(entries);
  EXPECT_EQ(entries->principal, std::string(513, 'a'));
}

TEST(KeytabInfo, FailsForADamagedKeytab) {
  const TemporaryRoot root;
  root.Write(kInstalled, "no keytab");
  KeytabEntry* entries = nullptr;
  EXPECT_LT(VORNNFSKeytabInfoGet(kInstalled, &entries), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kNoKeytab);
  EXPECT_EQ(entries, nullptr);
}

}  // namespace

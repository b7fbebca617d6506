#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include "nfsconf.h"
#include "processes.h"
#include "status.h"
#include "temporary_root.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr char kInstalled[] = "/etc/nfs/krb5.keytab";

struct FreeList {
  void operator()(KeytabEntry* list) const { VORNNFSKeytabInfoFree(list); }
};

// "2 nfs/box@X aes256-cts-hmac-sha1-96"
std::vector<std::string> ListInstalled() {
  KeytabEntry* head = nullptr;
  EXPECT_EQ(VORNNFSKeytabInfoGet(kInstalled, &head), 0);
  const std::unique_ptr<KeytabEntry, FreeList> list(head);
  std::vector<std::string> entries;
  for (const KeytabEntry* entry = head; entry != nullptr; entry = entry->next) {
    entries.push_back(std::to_string(entry->version) + " " + entry->principal + " " + entry->enc_type);
  }
  return entries;
}

class Keytab : public testing::Test {
 protected:
  // A keytab made by ktutil(1) of "principal kvno enctype" words.
  std::string Make(const std::vector<std::string>& keys) {
    std::string commands;
    for (const std::string& key : keys) {
      const std::size_t first = key.find(' ');
      const std::size_t second = key.find(' ', first + 1);
      commands += "add_entry -password -p " + key.substr(0, first) + " -k " +
                  key.substr(first + 1, second - first - 1) + " -e " + key.substr(second + 1) + "\nsecret\n";
    }
    root_.Write("/krb5.conf", "[libdefaults]\ndefault_realm = X\n");
    root_.Write("/commands", commands + "write_kt " + root_.At("/made") + "\nquit\n");
    unlink(root_.At("/made").c_str());
    const ProgramResult result =
        RunProgram({"sh", "-c", "KRB5_CONFIG=" + root_.At("/krb5.conf") + " ktutil <" + root_.At("/commands")});
    EXPECT_EQ(result.status, 0) << result.errors;
    return root_.Read("/made").value_or("");
  }

  // What importing an upload with this content answers.
  int Import(const std::string& content) {
    root_.Write("/upload", content);
    return VORNNFSKeytabImport(root_.At("/upload").c_str());
  }

  std::string Principal() {
    NFSConfRecord record;
    EXPECT_EQ(VORNNFSConfGet(&record), 0);
    return record.kerberos_principal;
  }

  mode_t ModeOfInstalled() {
    struct stat info {};
    EXPECT_EQ(stat(root_.At(kInstalled).c_str(), &info), 0);
    return info.st_mode & 07777U;
  }

  TemporaryRoot root_;
};

const std::vector<std::string> kThreeKeys = {"host/box@X 2 aes256-cts-hmac-sha1-96",
                                             "nfs/box.example@X 3 aes256-cts-hmac-sha1-96",
                                             "nfs/other@X 4 aes128-cts-hmac-sha1-96"};

TEST_F(Keytab, IsInstalledByteForByteForRootAlone) {
  const std::string content = Make(kThreeKeys);
  ASSERT_FALSE(content.empty());
  EXPECT_EQ(Import(content), 0);
  EXPECT_EQ(root_.Read(kInstalled), content);
  EXPECT_EQ(ModeOfInstalled(), 0600U);
  EXPECT_EQ(root_.Read("/upload"), content) << "the upload is whoever's made it";
}

TEST_F(Keytab, GetsItsModeAlsoWhereAnOlderOneWasOpenToAll) {
  root_.Write(kInstalled, "old");
  ASSERT_EQ(chmod(root_.At(kInstalled).c_str(), 0644), 0);
  EXPECT_EQ(Import(Make(kThreeKeys)), 0);
  EXPECT_EQ(ModeOfInstalled(), 0600U);
}

TEST_F(Keytab, GivesTheRecordTheFirstPrincipalOfTheNFSService) {
  EXPECT_EQ(Import(Make(kThreeKeys)), 0);
  EXPECT_EQ(Principal(), "nfs/box.example@X");
}

TEST_F(Keytab, GivesTheRecordTheFirstPrincipalWhereNoneIsOfTheNFSService) {
  EXPECT_EQ(Import(Make({"nfsd@X 1 aes256-cts-hmac-sha1-96", "host/b@X 1 aes256-cts-hmac-sha1-96"})), 0);
  EXPECT_EQ(Principal(), "nfsd@X");
}

TEST_F(Keytab, IsListedInFileOrderAsKlistDoes) {
  EXPECT_EQ(Import(Make(kThreeKeys)), 0);
  EXPECT_THAT(ListInstalled(),
              ElementsAre("2 host/box@X aes256-cts-hmac-sha1-96", "3 nfs/box.example@X aes256-cts-hmac-sha1-96",
                          "4 nfs/other@X aes128-cts-hmac-sha1-96"));
  const ProgramResult klist = RunProgram({"klist", "-k", "-e", root_.At(kInstalled)});
  EXPECT_EQ(klist.status, 0) << klist.errors;
  std::size_t at = 0;
  for (const char* line : {"2 host/box@X (aes256-cts-hmac-sha1-96)", "3 nfs/box.example@X (aes256-cts-hmac-sha1-96)",
                           "4 nfs/other@X (aes128-cts-hmac-sha1-96)"}) {
    at = klist.output.find(line, at);
    EXPECT_NE(at, std::string::npos) << line << " in " << klist.output;
  }
}

TEST_F(Keytab, ListsNothingWithoutAFile) { EXPECT_THAT(ListInstalled(), IsEmpty()); }

TEST_F(Keytab, FailsToListADamagedFile) {
  root_.Write(kInstalled, "damaged");
  KeytabEntry* list = nullptr;
  EXPECT_LT(VORNNFSKeytabInfoGet(kInstalled, &list), 0);
  EXPECT_EQ(KLIBCErrGet(), vorn::kNoKeytab);
  EXPECT_EQ(list, nullptr);
}

// Where an entry ends, the rest may be missing: what is left is a keytab.
TEST_F(Keytab, IsRefusedWhereverItIsCutOffWithinAnEntry) {
  const std::string content = Make(kThreeKeys);
  const std::string one = Make({kThreeKeys[0]});
  const std::string two = Make({kThreeKeys[0], kThreeKeys[1]});
  ASSERT_LT(one.size(), two.size());
  for (std::size_t length = 0; length < content.size(); ++length) {
    const bool whole = length == one.size() || length == two.size();
    EXPECT_EQ(Import(content.substr(0, length)), whole ? 0 : VORNNFS_KEYTAB_NO_KEYTAB) << length;
  }
}

TEST_F(Keytab, IsRefusedWhenItIsNone) {
  const std::string good = Make(kThreeKeys);
  const struct {
    const char* name;
    std::string content;
  } cases[] = {
      {"text", "not a keytab\n"},
      {"empty", ""},
      {"another version", "\x05\x09" + good.substr(2)},
      {"bytes behind the last entry", good + "x"},
      {"a huge size", std::string("\x05\x02\x7f\xff\xff\xff", 6)},
      {"a size of nothing", good + std::string(4, '\0')},
      {"an entry of rubbish", std::string("\x05\x02\0\0\0\x04rubb", 10)},
      {"the smallest size", std::string("\x05\x02\x80\0\0\0", 6)},
  };
  EXPECT_EQ(Import(good), 0);
  for (const auto& c : cases) {
    EXPECT_EQ(Import(c.content), VORNNFS_KEYTAB_NO_KEYTAB) << c.name;
    EXPECT_EQ(KLIBCErrGet(), vorn::kNoKeytab) << c.name;
    EXPECT_EQ(root_.Read(kInstalled), good) << c.name << ": the old one stays";
  }
}

TEST_F(Keytab, MayHaveHoles) {
  const std::string good = Make({kThreeKeys[1]});
  const std::string hole("\xff\xff\xff\xfc\0\0\0\0", 8);  // four bytes
  EXPECT_EQ(Import(good.substr(0, 2) + hole + good.substr(2)), 0);
  EXPECT_THAT(ListInstalled(), ElementsAre("3 nfs/box.example@X aes256-cts-hmac-sha1-96"));
}

TEST_F(Keytab, IsNotTakenFromAnythingButAPlainFile) {
  const std::string good = Make(kThreeKeys);
  root_.Write("/good", good);
  ASSERT_EQ(symlink(root_.At("/good").c_str(), root_.At("/link").c_str()), 0);
  ASSERT_EQ(mkdir(root_.At("/folder").c_str(), 0700), 0);
  ASSERT_EQ(mkfifo(root_.At("/pipe").c_str(), 0600), 0);
  for (const char* path : {"/link", "/folder", "/pipe", "/missing"}) {
    EXPECT_EQ(VORNNFSKeytabImport(root_.At(path).c_str()), VORNNFS_KEYTAB_FAILED) << path;
  }
  EXPECT_EQ(Import(std::string((1 << 20) + 1, 'x')), VORNNFS_KEYTAB_FAILED);
  EXPECT_EQ(KLIBCErrGet(), EFBIG);
  EXPECT_EQ(root_.Read(kInstalled), std::nullopt);
}

}  // namespace

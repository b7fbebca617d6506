#include <gmock/gmock.h>
#include <unistd.h>

#include <cstring>
#include <fstream>
#include <string>
#include <vector>

#include "each_call.h"
#include "entry_functions.h"
#include "expect_failure.h"
#include "fake_platform.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;

constexpr char kKeytabFile[] = "/etc/nfs/krb5.keytab";
constexpr char kScript[] = "KLIBCExec /usr/vorn/etc/rc.sysv/S83nfsd.sh reloadidmap - - -";

// An uploaded file, as the web server stores it.
class Upload {
 public:
  Upload() : path_(testing::TempDir() + "vorn-upload-" + std::to_string(getpid())) { std::ofstream(path_) << "keys"; }
  ~Upload() { unlink(path_.c_str()); }
  Upload(const Upload&) = delete;
  Upload& operator=(const Upload&) = delete;

  const std::string& path() const { return path_; }
  std::string Params() const { return R"({"keytab_file_tmp": ")" + path_ + "\"}"; }
  bool IsThere() const { return access(path_.c_str(), F_OK) == 0; }

 private:
  std::string path_;
};

KeytabEntry Key(int version, const char* principal, const char* enc_type) {
  KeytabEntry entry{};
  entry.version = version;
  std::strcpy(entry.principal, principal);
  std::strcpy(entry.enc_type, enc_type);
  return entry;
}

void Furnish(FakePlatform* platform) {
  std::strcpy(platform->record.kerberos_principal, "nfs/box.example@EXAMPLE");
  platform->keytab = {Key(2, "nfs/box.example@EXAMPLE", "aes256-cts-hmac-sha1-96"), Key(-1, "host/box@EXAMPLE", "")};
  platform->files = {kKeytabFile};
  platform->enabled = 1;
}

// ------------------------------------------------------------------------------------------- get

TEST(NFSKerberosGet, AnswersWithSupportAndThePrincipalOfAnInstalledKeytab) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSKerberosGet, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"kerberos_support": true, "kerberos_principal": "nfs/box.example@EXAMPLE"})"));
  EXPECT_THAT(platform.calls, ElementsAre("VORNNFSConfGet", "VORNNFSSupportKerberos",
                                          "KLIBCFileExist /etc/nfs/krb5.keytab", "SetSuccess"));
}

TEST(NFSKerberosGet, HasNoPrincipalWithoutAKeytab) {
  FakePlatform platform;
  Furnish(&platform);
  platform.files.clear();
  EXPECT_EQ(Call(NFSKerberosGet, "{}").data["kerberos_principal"], "");
}

TEST(NFSKerberosGet, SucceedsWithoutKerberosSupport) {
  FakePlatform platform;
  platform.kerberos_support = 0;
  const Answer answer = Call(NFSKerberosGet, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["kerberos_support"], false);
}

TEST(NFSKerberosGet, TreatsEveryNonZeroResultAsSupport) {
  FakePlatform platform;
  platform.kerberos_support = -1;
  EXPECT_EQ(Call(NFSKerberosGet, "{}").data["kerberos_support"], true);
}

TEST(NFSKerberosGet, FailsWhenTheRecordCannotBeRead) {
  FakePlatform platform;
  platform.Fail("VORNNFSConfGet");
  ExpectFailure(platform, Call(NFSKerberosGet, "{}"), "{}", 2302, "kerberos", {"Failed to VORNNFSConfGet."});
  EXPECT_THAT(platform.calls, ElementsAre("VORNNFSConfGet", "SetError", "GetParam"));
}

// ------------------------------------------------------------------------------------------ list

TEST(NFSKerberosList, ListsEveryKeyInOrder) {
  FakePlatform platform;
  Furnish(&platform);
  const Answer answer = Call(NFSKerberosList, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data, Parse(R"({"keytab": [
      {"version": 2, "kerberos_principal": "nfs/box.example@EXAMPLE", "enc_type": "aes256-cts-hmac-sha1-96"},
      {"version": -1, "kerberos_principal": "host/box@EXAMPLE", "enc_type": ""}]})"));
  EXPECT_THAT(platform.calls,
              ElementsAre("VORNNFSKeytabInfoGet /etc/nfs/krb5.keytab", "VORNNFSKeytabInfoFree", "SetSuccess"));
  EXPECT_THAT(platform.live_objects, IsEmpty());
}

TEST(NFSKerberosList, IsEmptyForAnEmptyKeytabAndReleasesNothing) {
  FakePlatform platform;
  platform.kerberos_support = 0;  // not asked for
  EXPECT_EQ(Call(NFSKerberosList, "{}").data, Parse(R"({"keytab": []})"));
  EXPECT_THAT(platform.calls, ElementsAre("VORNNFSKeytabInfoGet /etc/nfs/krb5.keytab", "SetSuccess"));
}

TEST(NFSKerberosList, FailsAndReleasesTheListOfAFailedRead) {
  for (const bool leaves_list : {true, false}) {
    FakePlatform platform;
    if (leaves_list) Furnish(&platform);
    platform.Fail("VORNNFSKeytabInfoGet");
    ExpectFailure(platform, Call(NFSKerberosList, "{}"), "{}", 2302, "kerberos", {"Failed to VORNNFSKeytabInfoGet."});
    EXPECT_EQ(testing::Matches(Contains("VORNNFSKeytabInfoFree"))(platform.calls), leaves_list);
  }
}

// ---------------------------------------------------------------------------------------- upload

TEST(NFSKerberosUploadKey, ImportsReloadsAndRemovesTheFile) {
  FakePlatform platform;
  Furnish(&platform);
  const Upload upload;
  const Answer answer = Call(NFSKerberosUploadKey, upload.Params());
  EXPECT_EQ(answer.code, 0);
  EXPECT_TRUE(answer.data.isNull());
  EXPECT_FALSE(upload.IsThere());
  EXPECT_THAT(platform.calls, ElementsAre("GetParam", "VornConf", "VORNNFSSupportKerberos",
                                          "VORNNFSKeytabImport " + upload.path(), "KLIBServiceIsEnabled nfsd", kScript,
                                          "KLIBCFileExist " + upload.path(), "~VornConf", "SetSuccess"));
  EXPECT_THAT(platform.log, IsEmpty());
}

TEST(NFSKerberosUploadKey, RunsNoScriptWhileTheServiceIsDisabled) {
  FakePlatform platform;
  const Upload upload;
  EXPECT_EQ(Call(NFSKerberosUploadKey, upload.Params()).code, 0);
  EXPECT_THAT(platform.calls, Not(Contains(kScript)));
  EXPECT_FALSE(upload.IsThere());
}

TEST(NFSKerberosUploadKey, TreatsAnUnknownServiceStateAsEnabled) {
  FakePlatform platform;
  platform.enabled = -1;
  const Upload upload;
  EXPECT_EQ(Call(NFSKerberosUploadKey, upload.Params()).code, 0);
  EXPECT_THAT(platform.calls, Contains(kScript));
}

struct ImportCase {
  int result;
  int code;
  std::vector<std::string> texts;
};

TEST(NFSKerberosUploadKey, DistinguishesImportResultsAndAlwaysRemovesTheFile) {
  const ImportCase cases[] = {
      {-2, 2331, {"Failed to VORNNFSKeytabImport: wrong keytab file format."}},
      {-1, 2302, {"Failed to VORNNFSKeytabImport."}},
      {-3, 0, {}},
      {0, 0, {}},
      {1, 0, {}},
  };
  for (const ImportCase& c : cases) {
    FakePlatform platform;
    Furnish(&platform);
    platform.keytab_import_result = c.result;
    const Upload upload;
    const Answer answer = Call(NFSKerberosUploadKey, upload.Params());
    EXPECT_EQ(answer.code, c.code) << c.result;
    EXPECT_FALSE(upload.IsThere()) << c.result;
    EXPECT_EQ(testing::Matches(Contains(kScript))(platform.calls), c.code == 0) << c.result;
    if (c.code != 0) ExpectFailure(platform, answer, upload.Params(), c.code, "kerberos", c.texts);
  }
}

TEST(NFSKerberosUploadKey, ReportsAFailedScriptAlthoughTheKeytabIsInstalled) {
  FakePlatform platform;
  Furnish(&platform);
  platform.Fail("KLIBCExec");
  const Upload upload;
  ExpectFailure(platform, Call(NFSKerberosUploadKey, upload.Params()), upload.Params(), 2302, "kerberos",
                {"Failed to KLIBCExec, vornerr = [0x00AB]"});
  EXPECT_FALSE(upload.IsThere());
}

TEST(NFSKerberosUploadKey, KeepsTheFileIfKerberosIsNotSupported) {
  FakePlatform platform;
  platform.kerberos_support = 0;
  const Upload upload;
  ExpectFailure(platform, Call(NFSKerberosUploadKey, upload.Params()), upload.Params(), 2330, "kerberos",
                {"not support kerberos."});
  EXPECT_TRUE(upload.IsThere());
  EXPECT_THAT(platform.calls,
              ElementsAre("GetParam", "VornConf", "VORNNFSSupportKerberos", "~VornConf", "SetError", "GetParam"));
}

TEST(NFSKerberosUploadKey, RefusesARequestThatNamesNoFile) {
  for (const char* params :
       {"null", "{}", R"({"keytab_file_tmp": null})", R"({"keytab_file_tmp": 5})", R"({"keytab_file_tmp": 5.5})",
        R"({"keytab_file_tmp": true})", R"({"keytab_file_tmp": ["x"]})", R"({"keytab_file_tmp": {}})"}) {
    FakePlatform platform;
    ExpectFailure(platform, Call(NFSKerberosUploadKey, params), params, 2332, "kerberos",
                  {"file path 'keytab_file_tmp' is missing."});
    EXPECT_THAT(platform.calls,
                ElementsAre("GetParam", "VornConf", "VORNNFSSupportKerberos", "~VornConf", "SetError", "GetParam"));
  }
}

TEST(NFSKerberosUploadKey, RemovesNoFileThatDoesNotExist) {
  FakePlatform platform;
  EXPECT_EQ(Call(NFSKerberosUploadKey, R"({"keytab_file_tmp": "/nowhere/keytab"})").code, 0);
}

// ------------------------------------------------------------------------------------- each call

TEST(NFSKerberos, ReleasesEverythingWhenAnyCallFailsOrThrows) {
  const Request get{NFSKerberosGet, "{}", Furnish};
  const Request list{NFSKerberosList, "{}", Furnish};
  const Request upload{NFSKerberosUploadKey, R"({"keytab_file_tmp": "/nowhere/keytab"})", Furnish};
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails(get), 1);
  EXPECT_EQ(ExpectOneAnswerWhenAnyCallFails(list), 1);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows(get), 4);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows(list), 2);
  EXPECT_EQ(ExpectOnlyReleasesWhenAnyCallThrows(upload), 8);
}

TEST(NFSKerberos, AcceptsEveryNonNegativeResult) {
  ExpectSuccessForEveryNonNegativeResult({NFSKerberosGet, "{}", Furnish});
  ExpectSuccessForEveryNonNegativeResult({NFSKerberosList, "{}", Furnish});
}

}  // namespace

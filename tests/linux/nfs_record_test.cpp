#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <string>
#include <utility>

#include "call.h"
#include "captured_log.h"
#include "core.h"
#include "current_box.h"
#include "ini_judge.h"
#include "nfsconf.h"
#include "processes.h"
#include "status.h"
#include "temporary_root.h"
#include "webapi.h"

namespace {

constexpr char kFile[] = "/etc/nfs.conf.d/vorn.conf";

NFSConfRecord Get() {
  NFSConfRecord record;
  std::memset(&record, 0x5a, sizeof record);
  EXPECT_EQ(VORNNFSConfGet(&record), 0);
  return record;
}

NFSConfRecord Full() {
  NFSConfRecord record{};
  record.read_size = 65536;
  record.write_size = 32768;
  std::strcpy(record.kerberos_principal, "nfs/box.example@EXAMPLE");
  record.enable_nfs_v4 = 1;
  record.unix_pri_enable = 1;
  record.statd_port = 4000;
  record.nlm_port = 4001;
  record.custom_port_enable = 1;
  return record;
}

bool Same(const NFSConfRecord& a, const NFSConfRecord& b) {
  return a.read_size == b.read_size && a.write_size == b.write_size &&
         std::strcmp(a.kerberos_principal, b.kerberos_principal) == 0 && a.enable_nfs_v4 == b.enable_nfs_v4 &&
         a.unix_pri_enable == b.unix_pri_enable && a.statd_port == b.statd_port && a.nlm_port == b.nlm_port &&
         a.custom_port_enable == b.custom_port_enable;
}

// Returns the value that the services read.
std::string Judged(const TemporaryRoot& root, const char* section, const char* key) {
  return GetByNfsconf(root.At("/etc/nfs.conf"), section, key).value_or("(the program does not end)");
}

TEST(NFSConf, OfABoxWithoutFilesHasTheServicesDefaults) {
  const TemporaryRoot root;
  NFSConfRecord defaults{};
  defaults.enable_nfs_v4 = 1;
  EXPECT_TRUE(Same(Get(), defaults));
}

TEST(NFSConf, ComesBackAsItWasStored) {
  const TemporaryRoot root;
  const NFSConfRecord full = Full();
  ASSERT_EQ(VORNNFSConfSet(&full), 0);
  EXPECT_TRUE(Same(Get(), full));
  const NFSConfRecord empty{};
  ASSERT_EQ(VORNNFSConfSet(&empty), 0);
  EXPECT_TRUE(Same(Get(), empty));
}

TEST(NFSConf, IsReadByTheServices) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[nfsd]\nvers4=n\nvers3=y\n[mountd]\nmanage-gids=n\n");
  const NFSConfRecord record = Full();
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  const struct {
    const char* section;
    const char* key;
    const char* value;
  } cases[] = {{"nfsd", "vers4", "y"},        {"nfsd", "vers3", "y"},    {"nfsd", "vers4.1", ""},
               {"statd", "port", "4000"},     {"lockd", "port", "4001"}, {"lockd", "udp-port", "4001"},
               {"mountd", "manage-gids", "y"}};
  for (const auto& c : cases) EXPECT_EQ(Judged(root, c.section, c.key), c.value) << c.section << " " << c.key;
}

TEST(NFSConf, TurnsVersion4OffWhateverMinorVersionsAreAskedFor) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[nfsd]\nvers4.1=y\nvers4.2=y\n");
  NFSConfRecord record = Full();
  record.enable_nfs_v4 = 0;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  for (const char* key : {"vers4", "vers4.0", "vers4.1", "vers4.2"}) EXPECT_EQ(Judged(root, "nfsd", key), "n") << key;
  record.enable_nfs_v4 = 1;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(Judged(root, "nfsd", "vers4"), "y");
  EXPECT_EQ(Judged(root, "nfsd", "vers4.0"), "");
  EXPECT_EQ(Judged(root, "nfsd", "vers4.1"), "y");
}

TEST(NFSConf, RemembersPortsThatAreNotInUse) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "");  // nfsconf(8) reads nothing without it; the services do
  NFSConfRecord record = Full();
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  record.custom_port_enable = 0;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  for (const char* section : {"statd", "lockd"}) EXPECT_EQ(Judged(root, section, "port"), "") << section;
  EXPECT_EQ(Judged(root, "lockd", "udp-port"), "");
  EXPECT_TRUE(Same(Get(), record));
  record.custom_port_enable = 1;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(Judged(root, "statd", "port"), "4000");
}

TEST(NFSConf, FollowsTheAdministratorsOwnFiles) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[nfsd]\nvers4=off\n[mountd]\nmanage-gids = TRUE\n[statd]\nport=16\n[lockd]\nport=10\n");
  root.Write("/etc/nfs.conf.d/2.conf", "[lockd]\nport=2\n");
  root.Write("/etc/nfs.conf.d/10.conf", "[lockd]\nport=11\n");
  root.Write("/etc/nfs.conf.d/.hidden.conf", "[lockd]\nport=12\n");
  root.Write("/etc/nfs.conf.d/9.conf~", "[lockd]\nport=13\n");
  const NFSConfRecord record = Get();
  EXPECT_EQ(record.enable_nfs_v4, 0);
  EXPECT_EQ(record.unix_pri_enable, 1);
  EXPECT_EQ(record.statd_port, 16);
  EXPECT_EQ(record.nlm_port, 11);
  EXPECT_EQ(std::to_string(record.nlm_port), Judged(root, "lockd", "port"));
  EXPECT_EQ(record.custom_port_enable, 1);
}

TEST(NFSConf, KeepsWhatIsNotItsOwn) {
  const TemporaryRoot root;
  root.Write(kFile, "# by hand\n[nfsd]\n threads = 16 ; many\nvers4 = y # keep\n\n[gssd]\nverbosity=1\n");
  NFSConfRecord record = Get();
  record.enable_nfs_v4 = 0;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  const std::string text = root.Read(kFile).value_or("");
  EXPECT_EQ(text.find("# by hand\n[nfsd]\n threads = 16 ; many\nvers4 = n # keep\n"), 0U) << text;
  EXPECT_NE(text.find("\n\n[gssd]\nverbosity=1\n"), std::string::npos) << text;
}

TEST(NFSConf, WritesNothingThatIsThereAlready) {
  const TemporaryRoot root;
  const NFSConfRecord record = Full();
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  const std::string text = root.Read(kFile).value_or("");
  ASSERT_EQ(std::rename(root.At(kFile).c_str(), root.At("/kept").c_str()), 0);
  root.Write(kFile, text);
  struct stat before {};
  struct stat after {};
  ASSERT_EQ(stat(root.At(kFile).c_str(), &before), 0);
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  ASSERT_EQ(stat(root.At(kFile).c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
}

TEST(NFSConf, RefusesToOverwriteAHandEditOfTheContext) {
  const TemporaryRoot root;
  root.Write(kFile, "[nfsd]\nvers4 = y\n");
  auto configuration = std::make_unique<VornConf>();
  NFSConfRecord record = Get();
  record.read_size = 4096;
  const std::string edited = "# switched off for the audit\n[nfsd]\nvers4 = n\n";
  root.Write(kFile, edited);
  for (int attempt = 0; attempt < 2; ++attempt) {
    EXPECT_LT(VORNNFSConfSet(&record), 0) << attempt;
    EXPECT_EQ(KLIBCErrGet(), vorn::kChangedBehind);
    EXPECT_EQ(root.Read(kFile), edited);
  }
  configuration.reset();
  configuration = std::make_unique<VornConf>();
  record = Get();
  EXPECT_EQ(record.enable_nfs_v4, 0);
  record.read_size = 4096;
  EXPECT_EQ(VORNNFSConfSet(&record), 0);
}

TEST(NFSConf, StoresARecordThatNoContextRead) {
  const TemporaryRoot root;
  const NFSConfRecord record = Get();
  root.Write(kFile, "# by hand\n[nfsd]\nvers4 = n\n");
  EXPECT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(Get().enable_nfs_v4, 1);
  EXPECT_THAT(root.Read(kFile).value_or(""), testing::StartsWith("# by hand\n"));
}

// A manual edit of any file that was read, also with a port check in between, which reads the files again.
TEST(NFSConf, RefusesAfterAHandEditOfAnyFileThatWasRead) {
  for (const char* file : {"/etc/nfs.conf", "/etc/nfs.conf.d/site.conf", "/etc/nfs.conf.d/new.conf", "/etc/part"}) {
    const TemporaryRoot root;
    root.Write("/etc/nfs.conf", "[mountd]\ninclude = part\n");
    root.Write("/etc/nfs.conf.d/site.conf", "[nfsd]\nthreads = 8\n");
    const VornConf configuration;
    NFSConfRecord record = Get();
    record.statd_port = 4000;
    root.Write(file, "[mountd]\nmanage-gids = y\n");
    WebUtils::IsPortConflict("nfs_statd", 4000, 4000);
    EXPECT_LT(VORNNFSConfSet(&record), 0) << file;
    EXPECT_EQ(KLIBCErrGet(), vorn::kChangedBehind) << file;
    EXPECT_FALSE(root.Read(kFile).has_value());
  }
}

TEST(NFSConf, WritesOnlyWhatChanged) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf.d/zz.conf", "[mountd]\nmanage-gids = y\n[lockd]\nport = 4001\n");
  NFSConfRecord record = Get();
  EXPECT_EQ(record.unix_pri_enable, 1);
  record.read_size = 4096;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(root.Read(kFile).value_or("").find("manage-gids"), std::string::npos);
  EXPECT_EQ(root.Read(kFile).value_or("").find("lockd"), std::string::npos);
}

TEST(NFSConf, RefusesAValueThatAnotherFileOverrides) {
  const struct {
    const char* text;
    void (*change)(NFSConfRecord*);
    const char* reason;
  } cases[] = {
      {"[mountd]\nmanage-gids = y\n", [](NFSConfRecord* r) { r->unix_pri_enable = 0; }, "zz.conf:2: manage-gids"},
      {"[nfsd]\nvers4.2 = y\n", [](NFSConfRecord* r) { r->enable_nfs_v4 = 0; }, "zz.conf:2: vers4.2"},
      {"[statd]\n\nport = 5000\n", [](NFSConfRecord* r) { r->statd_port = 4000; }, "zz.conf:3: port"},
      {"[lockd]\nport = 5000\n", [](NFSConfRecord* r) { r->custom_port_enable = 0; }, "zz.conf:2: port"},
      {"[lockd]\nudp-port = 5000\n",
       [](NFSConfRecord* r) {
         r->custom_port_enable = 1;
         r->nlm_port = 4000;
       },
       "zz.conf:2: udp-port"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write("/etc/nfs.conf.d/zz.conf", c.text);
    NFSConfRecord record = Get();
    c.change(&record);
    TakeLog();
    EXPECT_LT(VORNNFSConfSet(&record), 0) << c.text;
    EXPECT_EQ(KLIBCErrGet(), vorn::kOverridden) << c.text;
    EXPECT_THAT(LastText(TakeLog()), testing::HasSubstr(c.reason)) << c.text;
    EXPECT_FALSE(root.Read(kFile).has_value());
  }
}

TEST(NFSConf, CancelsPortsThatAnEarlierFileFixes) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[statd]\nport = 5000\n[lockd]\nport = 5001\n");
  NFSConfRecord record = Get();
  EXPECT_EQ(record.custom_port_enable, 1);
  record.custom_port_enable = 0;
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_EQ(Judged(root, "statd", "port"), "0");
  EXPECT_EQ(Judged(root, "lockd", "port"), "0");
  EXPECT_TRUE(Same(Get(), record)) << "the ports are remembered";
}

TEST(NFSConf, RefusesWhatTheServiceWouldNotStartWith) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[nfsd]\nvers3 = n\n");
  NFSConfRecord record = Full();
  record.nlm_port = record.statd_port;
  EXPECT_LT(VORNNFSConfSet(&record), 0) << "equal ports";
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  record = Full();
  record.enable_nfs_v4 = 0;
  TakeLog();
  EXPECT_LT(VORNNFSConfSet(&record), 0) << "no version";
  EXPECT_THAT(LastText(TakeLog()), testing::HasSubstr("nfs.conf:2: vers3 is off"));
  EXPECT_FALSE(root.Read(kFile).has_value());
  record = Full();
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  std::swap(record.statd_port, record.nlm_port);
  EXPECT_EQ(VORNNFSConfSet(&record), 0) << "exchanged";
  record.statd_port = record.nlm_port = 0;
  EXPECT_EQ(VORNNFSConfSet(&record), 0) << "any ports";
}

TEST(NFSConf, ReadsEachValueAsItsDaemonDoes) {
  const struct {
    const char* text;
    std::int32_t NFSConfRecord::*field;
    std::int32_t value;
    const char* remark;  // "": none
  } cases[] = {
      {"[statd]\nport = 2050x\n", &NFSConfRecord::statd_port, 2050, "vorn.conf:2: the value of port is read as 2050"},
      {"[statd]\nport = 04000\n", &NFSConfRecord::statd_port, 4000, ""},
      {"[statd]\nport = 0xFA0\n", &NFSConfRecord::statd_port, 0, "vorn.conf:2: the value of port is read as 0"},
      {"[statd]\nport = 65536\n", &NFSConfRecord::statd_port, 0, "vorn.conf:2: the value of port is not a port"},
      {"[vorn]\nread-size = 0x1000\n", &NFSConfRecord::read_size, 4096, ""},
      {"[vorn]\nread-size = big\n", &NFSConfRecord::read_size, 0, "vorn.conf:2: the value of read-size is not"},
      {"[vorn]\n\nread-size = -1\n", &NFSConfRecord::read_size, 0, "vorn.conf:3: the value of read-size is not"},
      {"[vorn]\nwrite-size = 99999999999\n", &NFSConfRecord::write_size, 0, "vorn.conf:2: the value of write-size"},
      {"[nfsd]\nvers4 = maybe\n", &NFSConfRecord::enable_nfs_v4, 1, "vorn.conf:2: the value of vers4 is neither"},
      {"[mountd]\nmanage-gids=$M\n", &NFSConfRecord::unix_pri_enable, 0,
       "vorn.conf:2: the value of manage-gids refers"},
      {"[mountd]\nmanage-gids=$M\n[environment]\nM=$N\nN=y\n", &NFSConfRecord::unix_pri_enable, 1, ""},
      {"[mountd]\nmanage-gids=$M\n[environment]\nM=$M\n", &NFSConfRecord::unix_pri_enable, 0,
       "manage-gids refers to itself"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write(kFile, c.text);
    TakeLog();
    EXPECT_EQ(Get().*c.field, c.value) << c.text;
    EXPECT_EQ(Get().*c.field, c.value) << c.text;
    const std::vector<LogLine> log = TakeLog();
    ASSERT_EQ(log.size(), *c.remark == '\0' ? 0U : 1U) << c.text << "once per version of the file";
    if (!log.empty()) {
      EXPECT_NE(log[0].text.find(c.remark), std::string::npos) << log[0].text;
    }
  }
}

TEST(NFSConf, FollowsAChainOfReferencesToItsEnd) {
  const TemporaryRoot root;
  std::string text = "[statd]\nport = $v1\n[environment]\n";
  for (int i = 1; i <= 30; ++i) text += "v" + std::to_string(i) + " = $V" + std::to_string(i + 1) + "\n";
  root.Write("/etc/nfs.conf", text + "v31 = 4031\n");
  EXPECT_EQ(Judged(root, "statd", "port"), "4031");
  EXPECT_EQ(Get().statd_port, 4031);
}

TEST(NFSConf, RefusesAChangeWhileAValueRefersToItself) {
  const struct {
    const char* text;    // of /etc/nfs.conf
    const char* reason;  // "": no value that is read refers to itself
  } cases[] = {
      {"[statd]\nport = $M\n[environment]\nM = $M\n", "/etc/nfs.conf:2: the value of port refers to itself"},
      {"[x]\nc = 1\nk = $a\n[environment]\na = $b\nb = $A\n", "/etc/nfs.conf:3: the value of k refers to itself"},
      {"[environment]\nM = $M\n[statd]\nport = $N\n", ""},
      {"[environment]\nM = $M\n[statd]\nport = $M\nport = 4000\n", ""},
      {"[environment]\nM = $M\n[environment \"x\"]\nM = 1\n[statd]\nport = $M\n",
       ArgumentsHideValues() ? "" : "/etc/nfs.conf:6: the value of port refers to itself"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write("/etc/nfs.conf", c.text);
    NFSConfRecord record = Get();
    record.read_size = 4096;
    TakeLog();
    const bool is_done = VORNNFSConfSet(&record) >= 0;
    ASSERT_EQ(is_done, *c.reason == '\0') << c.text;
    if (is_done) continue;
    EXPECT_EQ(KLIBCErrGet(), vorn::kSyntax);
    EXPECT_THAT(LastText(TakeLog()), testing::HasSubstr(c.reason)) << c.reason;
    EXPECT_FALSE(root.Read(kFile).has_value());
  }
}

TEST(NFSConf, RefusesToChangeWhatIncludesItself) {
  const struct {
    const char* text;  // of /etc/nfs.conf
    const char* part;  // of /etc/part
    const char* reason;
  } cases[] = {
      {"[statd]\nport = 4000\ninclude = nfs.conf\n", "", "/etc/nfs.conf:3: the file includes itself"},
      {"[statd]\nport = 4000\ninclude = part\n", "\ninclude = nfs.conf\n", "/etc/nfs.conf:3: the file includes itself"},
      {"[statd]\nport = 4000\ninclude = part\n", "include = ./part\n", "/etc/part:1: the file includes itself"},
      {"[statd]\nport = 4000\ninclude = part\n", "include = ../etc/part\n", "/etc/part:1: the file includes itself"},
      {"[statd]\nport = 4000\n[a \"b\"]\ninclude = part\n", "include = part\n",
       "/etc/part:1: the file includes itself"},
      {"[statd]\nport = 1\ninclude = part\n", "port = 4000\n[lockd]\ninclude = part\n", "/etc/part:3: the file inc"},
  };
  for (const auto& c : cases) {
    const TemporaryRoot root;
    root.Write("/etc/nfs.conf", c.text);
    root.Write("/etc/part", c.part);
    root.Write("/etc/nfs.conf.d/zz.conf", "[mountd]\nmanage-gids = y\n");
    TakeLog();
    NFSConfRecord record = Get();
    EXPECT_EQ(record.statd_port, 4000) << c.text << c.part;
    EXPECT_EQ(record.unix_pri_enable, 1) << "later files are read";
    const std::vector<LogLine> log = TakeLog();
    ASSERT_EQ(log.size(), 1U) << c.reason;
    EXPECT_NE(log[0].text.find(c.reason), std::string::npos) << log[0].text;
    record.read_size = 4096;
    EXPECT_LT(VORNNFSConfSet(&record), 0) << c.text;
    EXPECT_EQ(KLIBCErrGet(), vorn::kSyntax);
    EXPECT_THAT(LastText(TakeLog()), testing::HasSubstr(c.reason)) << c.reason;
    EXPECT_FALSE(root.Read(kFile).has_value());
  }
}

// A record is made once for a version of the files.
TEST(NFSConf, WarnsEachCallOfAValueThatIsIgnored) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[mountd]\nmanage-gids = perhaps\n");
  ASSERT_TRUE(Eventually([] { return vorn::CurrentBox().Read("/etc/nfs.conf")->is_settled; }));
  for (int reading = 0; reading < 3; ++reading) {
    const VORN::CallContext call({});
    NFSConfRecord record{};
    ASSERT_EQ(VORNNFSConfGet(&record), 0);
    EXPECT_THAT(call.warnings(), testing::ElementsAre(testing::HasSubstr("manage-gids"))) << reading;
  }
}

// Files that did not change are not read again.
TEST(NFSConf, FollowsFilesThatAppearAndDisappear) {
  const TemporaryRoot root;
  const auto settle = [](const char* path) {
    return Eventually([path] { return vorn::CurrentBox().Read(path)->is_settled; });
  };
  root.Write("/etc/nfs.conf", "[statd]\ninclude = part\ninclude = folder\n");
  std::filesystem::create_directory(root.At("/etc/folder"));  // skipped
  ASSERT_TRUE(settle("/etc/nfs.conf"));
  EXPECT_EQ(Get().statd_port, 0);
  std::filesystem::remove(root.At("/etc/folder"));
  root.Write("/etc/folder", "port = 4001\n");
  EXPECT_EQ(Get().statd_port, 4001);
  root.Write("/etc/part", "port = 4000\n");
  root.Write("/etc/nfs.conf.d/z.conf", "[statd]\nport = 4002\n");
  ASSERT_TRUE(settle("/etc/part"));
  ASSERT_TRUE(settle("/etc/nfs.conf.d/z.conf"));
  EXPECT_EQ(Get().statd_port, 4002);
  std::filesystem::remove(root.At("/etc/nfs.conf.d/z.conf"));
  EXPECT_EQ(Get().statd_port, 4001);
  std::filesystem::remove(root.At("/etc/folder"));
  EXPECT_EQ(Get().statd_port, 4000);
}

TEST(NFSConf, HasNoValueThatAnIncludedFileHides) {
  const bool is_hidden = ArgumentsHideValues();
  for (const char* include : {"[statd \"a\"]\ninclude = part\n", "[Statd \"a\"]\ninclude = middle\n"}) {
    const TemporaryRoot root;
    root.Write("/etc/nfs.conf", std::string("[statd]\nport = 4000\n[lockd]\nport = 4001\n") + include);
    root.Write("/etc/part", "port = 4002\n[lockd]\nport = 4003\n");
    root.Write("/etc/middle", "include = part\n");
    EXPECT_EQ(Judged(root, "statd", "port"), is_hidden ? "" : "4000");
    EXPECT_EQ(Judged(root, "lockd", "port"), "4003");
    EXPECT_EQ(Get().statd_port, is_hidden ? 0 : 4000);
    EXPECT_EQ(Get().nlm_port, 4003);
  }
}

TEST(NFSConf, ReadsIncludedFilesAtAnyDepth) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "[statd]\ninclude = p1\n");
  for (int depth = 1; depth <= 50; ++depth) {
    root.Write("/etc/p" + std::to_string(depth), "include = p" + std::to_string(depth + 1) + "\n");
  }
  root.Write("/etc/p51", "port = 4051\n");
  EXPECT_EQ(Judged(root, "statd", "port"), "4051");
  EXPECT_EQ(Get().statd_port, 4051);
}

TEST(NFSConf, TakesAPrincipalOfAnyLengthThatFits) {
  const TemporaryRoot root;
  NFSConfRecord record = Full();
  std::memset(record.kerberos_principal, 'p', sizeof record.kerberos_principal);
  record.kerberos_principal[515] = '\0';
  ASSERT_EQ(VORNNFSConfSet(&record), 0);
  EXPECT_TRUE(Same(Get(), record));
  root.Write(kFile, "[vorn]\nkerberos-principal = " + std::string(516, 'p') + "\n");
  EXPECT_STREQ(Get().kerberos_principal, "");
}

TEST(NFSConf, RefusesARecordThatNoFileCanCarry) {
  const struct {
    const char* name;
    void (*spoil)(NFSConfRecord*);
    int code;
  } cases[] = {
      {"negative read size", [](NFSConfRecord* r) { r->read_size = -1; }, EINVAL},
      {"negative write size", [](NFSConfRecord* r) { r->write_size = -1; }, EINVAL},
      {"negative port", [](NFSConfRecord* r) { r->statd_port = -1; }, EINVAL},
      {"port out of range", [](NFSConfRecord* r) { r->nlm_port = 65536; }, EINVAL},
      {"line feed", [](NFSConfRecord* r) { std::strcpy(r->kerberos_principal, "a\n[nfsd]\nvers4=n"); },
       vorn::kRefusedText},
      {"variable", [](NFSConfRecord* r) { std::strcpy(r->kerberos_principal, "$HOME"); }, vorn::kRefusedText},
      {"principal without end", [](NFSConfRecord* r) { std::memset(r->kerberos_principal, 'p', 516); },
       vorn::kRefusedText},
  };
  const TemporaryRoot root;
  const NFSConfRecord full = Full();
  ASSERT_EQ(VORNNFSConfSet(&full), 0);
  const auto before = root.Read(kFile);
  for (const auto& c : cases) {
    NFSConfRecord record = Full();
    c.spoil(&record);
    record.enable_nfs_v4 = 0;
    EXPECT_LT(VORNNFSConfSet(&record), 0) << c.name;
    EXPECT_EQ(KLIBCErrGet(), c.code) << c.name;
    EXPECT_EQ(root.Read(kFile), before) << c.name;
  }
  EXPECT_LT(VORNNFSConfSet(nullptr), 0);
  EXPECT_LT(VORNNFSConfGet(nullptr), 0);
}

}  // namespace

// The service script, with replacements for the service manager and for the kernel's files.
#include <gmock/gmock.h>
#include <sys/stat.h>

#include "private_namespaces.h"
#include "processes.h"
#include "requirements.h"
#include "temporary_root.h"

namespace {

[[maybe_unused]] const bool kRequired = RequirePrivateNamespaces();

using testing::HasSubstr;
using std::string_literals::operator""s;  // NOLINT(misc-unused-using-decls): it is used

constexpr char kFlush[] = "/net/rpc/auth.rpcsec.context/flush";
constexpr char kExportsChannel[] = "/net/rpc/nfsd.export/channel";
constexpr char kExportsContent[] = "/net/rpc/nfsd.export/content";
constexpr char kExportsFlush[] = "/net/rpc/nfsd.export/flush";
constexpr char kHandlesFlush[] = "/net/rpc/nfsd.fh/flush";
constexpr char kKeytabWithoutKeys[] = "\005\002";
constexpr char kLimit[] = "/fs/nfsd/max_block_size";
constexpr char kLockPort[] = "/sys/fs/nfs/nlm_tcpport";
constexpr char kLockUDPPort[] = "/sys/fs/nfs/nlm_udpport";
constexpr char kMark[] = "/run/nfs-leaves-groups-alone";

// A box in namespaces of its own: a systemctl that records its arguments, and the test's own /etc, /proc, /run and
// /var/lib.
class Box {
 public:
  Box() {
    folder_.Write("/bin/systemctl", "#!/bin/sh\necho \"$*\" >>" + folder_.At("/calls") +
                                        "\ncase \"$*\" in *is-active*) [ -e " + folder_.directory() +
                                        "/active/$3 ];; *) [ ! -e " + folder_.At("/broken") + " ];; esac\n");
    folder_.Write("/bin/sleep", "#!/bin/sh\necho \"sleep $*\" >>" + folder_.At("/calls") + "\n");
    folder_.Write("/bin/idmap-compile", "#!/bin/sh\necho compile >>" + folder_.At("/calls") + "\n[ ! -e " +
                                            folder_.At("/uncompilable") + " ]\n");
    folder_.Write("/bin/nft", "#!/bin/sh\necho \"nft $*\" >>" + folder_.At("/calls") + "\n");
    for (const char* program : {"/bin/systemctl", "/bin/sleep", "/bin/idmap-compile", "/bin/nft"}) {
      chmod(folder_.At(program).c_str(), 0755);
    }
    // The box's own /etc has no alternatives(7).
    RunProgram({"sh", "-c", "ln -s \"$(readlink -f \"$(command -v awk)\")\" " + folder_.At("/bin/awk")});
    folder_.Write("/run/empty", "");
    IsConfigured("");
    folder_.Write("/etc/nfs.conf", "");
    folder_.Write("/lib/vorn/idmap/settings", "stored\n");
    for (const char* file : {kFlush, kExportsFlush, kHandlesFlush, kLimit}) {
      folder_.Write("/proc" + std::string(file), "");
    }
    for (const char* port : {kLockPort, kLockUDPPort}) folder_.Write("/proc" + std::string(port), "32803\n");
  }

  void Runs(const std::string& unit) const { folder_.Write("/active/" + unit, ""); }
  void HasBrokenServices() const { folder_.Write("/broken", ""); }
  void HasNoKernelServer() const { RunProgram({"rm", "-r", folder_.At("/proc/fs"), folder_.At("/proc/net")}); }
  void HasADamagedIDMap() const { folder_.Write("/uncompilable", ""); }
  // A daemon that read these settings when it started. The settings "stored" are those that are stored now.
  void HasRead(const std::string& unit, const std::string& settings) const {
    Runs(unit + ".service");
    folder_.Write("/lib/vorn/idmap/" + unit + ".settings", settings + "\n");
  }
  // `age`, as touch(1) reads it, is relative to the start of svcgssd.
  void HasAKeytab(const std::string& age) const {
    folder_.Write("/etc/nfs/krb5.keytab", "");
    RunProgram({"touch", "-r", folder_.At("/lib/vorn/idmap/rpc-svcgssd.settings"), "-d", age,
                folder_.At("/etc/nfs/krb5.keytab")});
  }
  void HasAMountDaemon(const std::string& content) const {
    folder_.Write("/bin/rpc.mountd", content);
    chmod(folder_.At("/bin/rpc.mountd").c_str(), 0755);
  }
  void HasAMachineKeytab(const std::string& content) const { folder_.Write("/etc/krb5.keytab", content); }
  // The platform wrote `entries`, and the kernel shows `content` after it was told.
  void IsToldToForget(const std::string& entries, const std::string& content) const {
    folder_.Write("/run/vorn/expired-rights", entries);
    folder_.Write("/proc" + std::string(kExportsChannel), "");
    folder_.Write("/proc" + std::string(kExportsContent), content);
  }
  void CannotFlushExports() const {
    RunProgram({"rm", folder_.At("/proc" + std::string(kExportsFlush))});
    RunProgram({"mkdir", folder_.At("/proc" + std::string(kExportsFlush))});
  }
  void HasServed() const { folder_.Write("/proc" + std::string(kLimit), "65536\n"); }
  void HasOpenedPorts() const { folder_.Write("/lib/vorn/firewall.nft", ""); }
  void LeftGroupsAlone() const { folder_.Write(kMark, ""); }
  void IsConfigured(const std::string& text) const { folder_.Write("/etc/nfs.conf.d/vorn.conf", text); }

  bool LeavesGroupsAlone() const { return folder_.Read(kMark).has_value(); }

  // Runs the script with these settings of NFS, and expects that it succeeds.
  void RunWith(const std::string& configuration, const std::string& word) const {
    IsConfigured(configuration);
    const ProgramResult result = Run(word);
    EXPECT_EQ(result.status, 0) << configuration << result.errors;
  }

  ProgramResult Run(const std::string& word) const {
    const std::string place = folder_.directory();
    std::vector<std::string> command = GetPrivateNamespaces().command;
    command.insert(command.end(), {"sh", "-ec",
                                   "for folder in etc proc run var/lib; do mount --bind " + place +
                                       "/${folder##*/} /$folder; done\n"
                                       "PATH=" +
                                       place + "/bin:$PATH VORN_ROOT=/ exec " BOX_SCRIPT " " + word});
    return RunProgram(command);
  }

  std::optional<std::string> MachineKeytab() const { return folder_.Read("/etc/krb5.keytab"); }
  std::string Calls() const { return folder_.Read("/calls").value_or(""); }
  std::string SettingsOf(const std::string& unit) const {
    return folder_.Read("/lib/vorn/idmap/" + unit + ".settings").value_or("");
  }
  std::string Kernel(const char* file) const { return folder_.Read("/proc" + std::string(file)).value_or(""); }

 private:
  TemporaryRoot folder_;
};

TEST(MachineKeytab, IsWrittenWithoutKeysForADaemonThatLooksForIt) {
  const Box box;
  box.HasAMountDaemon("\0krb5\0/etc/krb5.keytab\0"s);
  const ProgramResult result = box.Run("machinekeytab");
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_EQ(box.MachineKeytab(), kKeytabWithoutKeys);
  EXPECT_EQ(box.Kernel(kExportsFlush), "1\n");
}

TEST(MachineKeytab, IsNotWrittenForOtherDaemons) {
  const Box box;
  box.HasAMountDaemon("\0krb5\0"s);
  EXPECT_EQ(box.Run("machinekeytab").status, 0);
  EXPECT_EQ(box.MachineKeytab(), std::nullopt);
  EXPECT_EQ(box.Kernel(kExportsFlush), "");
}

TEST(MachineKeytab, StaysAsItIs) {
  const Box box;
  box.HasAMountDaemon("/etc/krb5.keytab");
  box.HasAMachineKeytab("keys of the machine");
  EXPECT_EQ(box.Run("machinekeytab").status, 0);
  EXPECT_EQ(box.MachineKeytab(), "keys of the machine");
  EXPECT_EQ(box.Kernel(kExportsFlush), "");
}

TEST(ReloadIDMap, RestartsBothDaemonsAndThenHasTheKernelForgetItsAnswers) {
  const Box box;
  box.Runs("nfs-server.service");
  const ProgramResult result = box.Run("reloadidmap");
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_EQ(box.Calls(),
            "compile\n-q is-active gssproxy.service\n-q is-active nfs-server.service\n"
            "-q is-active rpc-svcgssd.service\nrestart rpc-svcgssd.service\n"
            "-q is-active nfs-idmapd.service\ntry-restart nfs-idmapd.service\n");
  EXPECT_EQ(box.Kernel(kFlush), "1\n");
}

TEST(ReloadIDMap, RestartsADaemonOnlyForWhatItReadsWhenItStarts) {
  const struct {
    const char* name;
    const char* svcgssd;
    const char* idmapd;
    const char* keytab;
    bool restarts_svcgssd;
    bool restarts_idmapd;
  } cases[] = {{"nothing", "stored", "stored", nullptr, false, false},
               {"the settings of both", "old", "old", nullptr, true, true},
               {"the settings of idmapd", "stored", "old", nullptr, false, true},
               {"a keytab from before the start", "stored", "stored", "-1 second", false, false},
               {"a keytab of the moment of the start", "stored", "stored", "0 seconds", true, false},
               {"a new keytab", "stored", "stored", "+1 second", true, false}};
  for (const auto& c : cases) {
    const Box box;
    box.Runs("nfs-server.service");
    box.HasRead("rpc-svcgssd", c.svcgssd);
    box.HasRead("nfs-idmapd", c.idmapd);
    if (c.keytab != nullptr) box.HasAKeytab(c.keytab);
    const ProgramResult result = box.Run("reloadidmap");
    EXPECT_EQ(result.status, 0) << c.name << result.errors;
    const std::string calls = "\n" + box.Calls();
    EXPECT_EQ(calls.find("\nrestart rpc-svcgssd.service\n") != std::string::npos, c.restarts_svcgssd)
        << c.name << calls;
    EXPECT_EQ(calls.find("\ntry-restart nfs-idmapd.service\n") != std::string::npos, c.restarts_idmapd) << calls;
    EXPECT_EQ(calls.rfind("\ncompile\n", 0), 0U) << "the table comes before the flush: " << calls;
    EXPECT_EQ(box.Kernel(kFlush), "1\n") << c.name;
  }
}

TEST(ReloadIDMap, FailsIfTheMapDoesNotCompile) {
  const Box box;
  box.HasADamagedIDMap();
  EXPECT_EQ(box.Run("reloadidmap").status, 1);
  EXPECT_EQ(box.Kernel(kFlush), "1\n");
}

TEST(StartIDMap, GivesTheDaemonTheSettingsThatAreStored) {
  const Box box;
  box.HasRead("nfs-idmapd", "old");
  const ProgramResult result = box.Run("idmapstart nfs-idmapd");
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_EQ(box.SettingsOf("nfs-idmapd"), "stored\n");
  EXPECT_EQ(box.Calls(), "compile\n");
}

TEST(StartIDMap, LeavesTheSettingsOfTheStartBeforeIfTheMapDoesNotCompile) {
  const Box box;
  box.HasRead("nfs-idmapd", "old");
  box.HasADamagedIDMap();
  EXPECT_NE(box.Run("idmapstart nfs-idmapd").status, 0);
  EXPECT_EQ(box.SettingsOf("nfs-idmapd"), "old\n");
}

TEST(ReloadIDMap, StartsNoDaemonForAServiceThatIsOff) {
  const Box box;
  EXPECT_EQ(box.Run("reloadidmap").status, 0);
  EXPECT_EQ(box.Calls(),
            "compile\n-q is-active gssproxy.service\n-q is-active nfs-server.service\n-q is-active nfs-idmapd.service\n"
            "try-restart nfs-idmapd.service\n");
}

TEST(ReloadIDMap, SaysThatGssproxyIgnoresTheMap) {
  const Box box;
  box.Runs("nfs-server.service");
  box.Runs("gssproxy.service");
  const ProgramResult result = box.Run("reloadidmap");
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_THAT(result.output, HasSubstr("gssproxy serves Kerberos here"));
  EXPECT_EQ(
      box.Calls(),
      "compile\n-q is-active gssproxy.service\n-q is-active nfs-idmapd.service\ntry-restart nfs-idmapd.service\n");
  EXPECT_EQ(box.Kernel(kFlush), "1\n");
}

TEST(ReloadIDMap, FailsWhereADaemonDoesNotCome) {
  const Box box;
  box.HasBrokenServices();
  const ProgramResult result = box.Run("reloadidmap");
  EXPECT_EQ(result.status, 1);
  EXPECT_THAT(result.output, HasSubstr("the ID map was not taken up"));
  EXPECT_EQ(box.Kernel(kFlush), "1\n") << "what can be done is done";
}

TEST(ReloadIDMap, NeedsNoKernelServer) {
  const Box box;
  box.HasNoKernelServer();
  const ProgramResult result = box.Run("reloadidmap");
  EXPECT_EQ(result.status, 0) << result.errors;
}

TEST(ReloadIDMap, OnlySaysOnATrialRootWhatItWouldDo) {
  const TemporaryRoot root;
  const ProgramResult result = RunProgram({BOX_SCRIPT, "reloadidmap"});
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_EQ(result.output,
            "S83nfsd: would run: idmap-compile\n"
            "S83nfsd: would run: systemctl try-restart nfs-idmapd.service\n"
            "S83nfsd: would write 1 to /proc/net/rpc/auth.rpcsec.context/flush\n");
  EXPECT_THAT(root.Names(""), testing::IsEmpty());
}

TEST(ForgetRights, WritesEachEntryAsItIs) {
  const TemporaryRoot root;
  root.Write("/run/vorn/expired-rights", "10.0.0.1 /srv/a\\040b 1700000000\n10.0.0.1 / 1700000000\n");
  const ProgramResult result = RunProgram({BOX_SCRIPT, "forgetrights"});
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_EQ(result.output,
            "S83nfsd: would write 10.0.0.1 /srv/a\\040b 1700000000 to /proc/net/rpc/nfsd.export/channel\n"
            "S83nfsd: would write 10.0.0.1 / 1700000000 to /proc/net/rpc/nfsd.export/channel\n");
}

TEST(ForgetRights, FlushesAllIfTheKernelStillGrantsThem) {
  const struct {
    const char* name;
    const char* content;
    bool flushes;
  } cases[] = {{"expired", "#path domain(flags)\n# /srv/a\\040(b)\t10.0.0.1(rw,sync)\n", false},
               {"granted", "/srv/other\t10.0.0.1(rw)\n/srv/a\\040(b)\t10.0.0.1(rw,sync)\n", true},
               {"in a part of the directory", "/srv/a\\040(b)/c\t10.0.0.1(rw,sync)\n", false},
               {"of another client", "/srv/a\\040(b)\t10.0.0.11(rw,sync)\n", false},
               {"nothing", "", false}};
  for (const auto& c : cases) {
    const Box box;
    box.IsToldToForget("10.0.0.1 /srv/a\\040(b) 1700000000\n", c.content);
    const ProgramResult result = box.Run("forgetrights");
    EXPECT_EQ(result.status, 0) << c.name << result.errors;
    for (const char* flush : {kExportsFlush, kHandlesFlush}) {
      EXPECT_EQ(box.Kernel(flush), c.flushes ? "1\n" : "") << c.name;
    }
    EXPECT_EQ(box.Kernel(kExportsChannel), "10.0.0.1 /srv/a\\040(b) 1700000000\n") << c.name;
  }
}

TEST(ForgetRights, FailsIfTheKernelCannotBeTold) {
  const Box box;
  box.IsToldToForget("10.0.0.1 /srv/a 1700000000\n", "/srv/a\t10.0.0.1(rw)\n");
  box.CannotFlushExports();
  EXPECT_NE(box.Run("forgetrights").status, 0);
}

TEST(ForgetRights, HasNothingToDoWithoutEntries) {
  const TemporaryRoot root;
  EXPECT_EQ(RunProgram({BOX_SCRIPT, "forgetrights"}).status, 0);
}

TEST(TransferSizes, GiveTheKernelTheLargerOne) {
  const struct {
    const char* configuration;
    const char* limit;
  } cases[] = {{"[vorn]\nread-size = 65536\nwrite-size = 131072\n", "131072\n"},
               {"[vorn]\nread-size = 131072\nwrite-size = 65536\n", "131072\n"},
               {"[vorn]\nread-size = 8192\nwrite-size = 0\n", "8192\n"},
               {"[vorn]\nwrite-size = 8192\n", "8192\n"},
               {"[vorn]\nread-size = 0\nwrite-size = 0\n", ""},
               {"[vorn]\nread-size = many\nwrite-size = -1\n", ""},
               {"", ""}};
  for (const auto& c : cases) {
    const Box box;
    box.RunWith(c.configuration, "transfersizes");
    EXPECT_EQ(box.Kernel(kLimit), c.limit) << c.configuration;
  }
}

TEST(TransferSizes, AreReadBelowATrialRoot) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "");
  root.Write("/etc/nfs.conf.d/vorn.conf", "[vorn]\nread-size = 65536\nwrite-size = 8192\n");
  EXPECT_EQ(RunProgram({BOX_SCRIPT, "transfersizes"}).output,
            "S83nfsd: would write 65536 to /proc/fs/nfsd/max_block_size\n");
}

TEST(LockPorts, AreForgottenOnceTheyAreNotConfigured) {
  const struct {
    const char* configuration;
    const char* tcp;
    const char* udp;
  } cases[] = {{"", "0\n", "0\n"},
               {"[lockd]\nport = 0\nudp-port = 0\n", "0\n", "0\n"},
               {"[lockd]\nport = many\n", "0\n", "0\n"},
               {"[lockd]\nport = 32803\n", "32803\n", "32803\n"},
               {"[lockd]\nport = 32803x\nudp-port = 32803\n", "32803\n", "32803\n"},
               {"[lockd]\nudp-port = 32803\n", "0\n", "32803\n"}};
  for (const auto& c : cases) {
    const Box box;
    box.RunWith(c.configuration, "lockports");
    EXPECT_EQ(box.Kernel(kLockPort), c.tcp) << c.configuration;
    EXPECT_EQ(box.Kernel(kLockUDPPort), c.udp) << c.configuration;
  }
}

TEST(Groups, DelayOnlyTheFirstServiceThatStoppedManagingThem) {
  const struct {
    const char* name;
    const char* configuration;
    bool has_served;
    bool left_alone;
    const char* calls;
    bool leaves_alone;
  } cases[] = {
      {"they are no more managed", "[mountd]\nmanage-gids = n\n", true, false, "sleep 31\n", true},
      {"they are unset", "", true, false, "sleep 31\n", true},
      {"they were not managed before", "[mountd]\nmanage-gids = n\n", true, true, "", true},
      {"the box has just booted", "[mountd]\nmanage-gids = n\n", false, false, "", true},
      {"they are managed", "[mountd]\nmanage-gids = Yes\n", true, false, "", false},
      {"they are managed again", "[mountd]\nmanage-gids = 1\n", true, true, "", false},
  };
  for (const auto& c : cases) {
    const Box box;
    if (c.has_served) box.HasServed();
    if (c.left_alone) box.LeftGroupsAlone();
    box.RunWith(c.configuration, "groups");
    EXPECT_EQ(box.Calls(), c.calls) << c.name;
    EXPECT_EQ(box.LeavesGroupsAlone(), c.leaves_alone) << c.name;
  }
}

TEST(Groups, AreNotWaitedForOnATrialRoot) {
  const TemporaryRoot root;
  root.Write("/etc/nfs.conf", "");
  root.Write("/proc/fs/nfsd/max_block_size", "65536\n");
  const ProgramResult result = RunProgram({BOX_SCRIPT, "groups"});
  EXPECT_EQ(result.status, 0) << result.errors;
  EXPECT_THAT(result.output, HasSubstr("would run: sleep 31"));
}

TEST(Firewall, IsLoadedAgainOnceTheBoxHasOpenedPorts) {
  const Box box;
  EXPECT_EQ(box.Run("firewall").status, 0);
  EXPECT_EQ(box.Calls(), "");
  box.HasOpenedPorts();
  EXPECT_EQ(box.Run("firewall").status, 0);
  EXPECT_EQ(box.Calls(), "nft -f /var/lib/vorn/firewall.nft\n");
}

TEST(ServiceScript, RefusesOtherWords) {
  const TemporaryRoot root;
  for (const char* word : {"", "start", "reload"}) {
    const ProgramResult result = RunProgram({BOX_SCRIPT, word});
    EXPECT_EQ(result.status, 2) << word;
    EXPECT_THAT(result.errors, HasSubstr("usage:"));
  }
}

}  // namespace

#include "live_settings.h"

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <syslog.h>

#include <cerrno>

#include "captured_log.h"
#include "core.h"
#include "current_box.h"
#include "nfsconf.h"
#include "processes.h"
#include "requirements.h"
#include "temporary_root.h"

namespace {

using testing::HasSubstr;
using testing::Not;

constexpr char kDropIn[] = "/etc/systemd/system/nfs-server.service.d/vorn.conf";

TEST(TransferSizes, AreHandedOverByADropInOfTheUnit) {
  const TemporaryRoot root;
  ASSERT_EQ(VORNNFSUDPPrefSizeSet(65536, 131072), 0);
  EXPECT_THAT(root.Read(kDropIn).value_or(""),
              HasSubstr("\n[Service]\nExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh groups\n"
                        "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh transfersizes\n"
                        "ExecStartPre=-/usr/vorn/etc/rc.sysv/S83nfsd.sh lockports\n"));
}

// systemd-analyze verifies the drop-in. It requires the programs of a unit, so the root has them.
TEST(TransferSizes, AreUnderstoodBySystemd) {
  if (const std::string missing = ProgramMissing("systemd-analyze"); !missing.empty()) {
    if (RunsInCI()) FAIL() << missing;
    GTEST_SKIP() << missing;
  }
  const TemporaryRoot root;
  ASSERT_EQ(VORNNFSUDPPrefSizeSet(65536, 131072), 0);
  root.Write("/etc/systemd/system/nfs-server.service", "[Service]\nType=oneshot\nExecStart=/bin/true\n");
  for (const char* program : {"/bin/true", "/usr/vorn/etc/rc.sysv/S83nfsd.sh"}) {
    root.Write(program, "#!/bin/sh\n");
    ASSERT_EQ(chmod(root.At(program).c_str(), 0755), 0);
  }
  const ProgramResult verdict =
      RunProgram({"systemd-analyze", "verify", "--recursive-errors=no", "--root=" + root.directory(),
                  root.At("/etc/systemd/system/nfs-server.service")});
  EXPECT_EQ(verdict.status, 0) << verdict.errors;
  EXPECT_THAT(verdict.errors, Not(HasSubstr("vorn.conf")));
}

TEST(TransferSizes, LeaveAPreparedUnitAlone) {
  const TemporaryRoot root;
  ASSERT_TRUE(vorn::PrepareTransferSizes(vorn::CurrentBox()).ok());
  struct stat before {};
  struct stat after {};
  ASSERT_EQ(stat(root.At(kDropIn).c_str(), &before), 0);
  EXPECT_TRUE(vorn::PrepareTransferSizes(vorn::CurrentBox()).ok());
  ASSERT_EQ(stat(root.At(kDropIn).c_str(), &after), 0);
  EXPECT_EQ(before.st_ino, after.st_ino);
}

TEST(TransferSizes, FailWhereTheUnitCannotBePrepared) {
  const TemporaryRoot root;
  root.Write("/etc/systemd", "a file, and no folder");
  EXPECT_LT(VORNNFSUDPPrefSizeSet(8192, 8192), 0);
  EXPECT_NE(KLIBCErrGet(), 0);
}

TEST(TransferSizes, AreNotNegative) {
  const TemporaryRoot root;
  EXPECT_LT(VORNNFSUDPPrefSizeSet(-1, 8192), 0);
  EXPECT_LT(VORNNFSUDPPrefSizeSet(8192, -1), 0);
  EXPECT_EQ(KLIBCErrGet(), EINVAL);
  EXPECT_FALSE(root.Read(kDropIn).has_value());
}

TEST(LiveSettings, SayWhenTheyTakeEffect) {
  const struct {
    int (*operation)();
    const char* text;
  } cases[] = {
      {[] { return VORNNFSUDPPrefSizeSet(8192, 65536); }, "at most 65536 bytes when it starts the next time"},
      {[] { return VORNNFSUDPPrefSizeSet(0, 0); }, "the kernel chooses the size of NFS transfers again"},
      {[] { return VORNNFSUNIXPriEnableSet(1); }, "UNIX permissions are managed when NFS starts the next time"},
      {[] { return VORNNFSUNIXPriEnableSet(0); }, "UNIX permissions are left alone when NFS starts the next time"}};
  const TemporaryRoot root;
  for (const auto& c : cases) {
    TakeLog();
    EXPECT_EQ(c.operation(), 0) << c.text;
    const std::vector<LogLine> log = TakeLog();
    ASSERT_EQ(log.size(), 1U) << c.text;
    EXPECT_EQ(log[0].priority, LOG_NOTICE);
    EXPECT_THAT(log[0].text, HasSubstr(c.text));
  }
}

}  // namespace

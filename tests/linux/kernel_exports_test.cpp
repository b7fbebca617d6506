#include "kernel_exports.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ctime>
#include <sstream>
#include <string>
#include <vector>

#include "kernel_caches.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

// The caches have entries as the kernel of Debian 12 shows them.
class KernelExports : public testing::Test {
 protected:
  KernelExports() {
    caches_.Fill("auth.unix.ip",
                 "#class IP domain\n"
                 "nfsd 10.0.0.1 10.0.0.1,10.0.0.0/24\n"
                 "nfsd 10.0.0.2 10.0.0.0/24\n"
                 "nfsd 2001:db8:0000:0000:0000:0000:0000:0001 2001:db8::1\n"
                 "# nfsd 10.9.0.9 -no-domain-\n");
    caches_.Fill("nfsd.export",
                 "#path domain(flags)\n"
                 "/\t10.0.0.1(ro,v4root,fsid=0,sec=390003:1)\n"
                 "/srv\t10.0.0.1(ro,v4root)\n"
                 "/srv/data\t10.0.0.1(rw,sec=1)\n"
                 "# /srv/data\t10.0.0.2()\n"
                 "/srv/data/inner\\040volume\t10.0.0.1(rw,sec=1)\n"
                 "/srv/database\t10.0.0.1(rw,sec=1)\n");
    caches_.Fill("nfsd.fh",
                 "#domain fsidtype fsid [path]\n"
                 "10.0.0.1 7 0x0102030405060708090a0b0c0d0e0f1011121314 /srv/data\n"
                 "10.0.0.1 1 0x00000000 /\n"
                 "# 10.0.0.2 6 0x01020304\n");
  }

  // The lines that were written to the channel, with "PAST" for a time that has passed.
  std::vector<std::string> Expired(const std::string& cache) const {
    std::vector<std::string> lines;
    std::istringstream text(caches_.Channel(cache));
    for (std::string line; std::getline(text, line);) {
      const std::size_t blank = line.rfind(' ');
      EXPECT_LT(std::stoll(line.substr(blank)), std::time(nullptr)) << line;
      lines.push_back(line.substr(0, blank) + " PAST");
    }
    return lines;
  }

  Status Forget(const ExportTableUpdate& update) {
    return ForgetExports(caches_.folder(), update, [this](const std::string& lines) {
      if (!can_write_) return Status::Failure(kServiceFailed, "no unit");
      caches_.Write("nfsd.export", "channel", lines);
      return Status();
    });
  }

  TemporaryRoot folder_;
  const KernelCaches caches_{folder_};
  bool can_write_ = true;
};

ExportTableUpdate Changed(const std::string& path) {
  ExportTableUpdate update;
  update.changed = {path};
  update.exported = {"/srv/data", "/srv/database"};
  return update;
}

TEST_F(KernelExports, ForgetsTheRightsInAChangedDirectoryAndAboveAndBelowIt) {
  EXPECT_TRUE(Forget(Changed("/srv/data")).ok());
  EXPECT_THAT(Expired("nfsd.export"),
              ElementsAre("10.0.0.1 / PAST", "10.0.0.1 /srv PAST", "10.0.0.1 /srv/data PAST", "10.0.0.2 /srv/data PAST",
                          "10.0.0.1 /srv/data/inner\\040volume PAST"));
  EXPECT_FALSE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(KernelExports, AsksAgainForHandlesWithoutADirectory) {
  EXPECT_TRUE(Forget(Changed("/srv/data")).ok());
  EXPECT_THAT(Expired("nfsd.fh"), ElementsAre("10.0.0.2 6 \\x04030201 PAST"));
}

TEST_F(KernelExports, ForgetsNoAddressWhereTheClientsAreTheSame) {
  EXPECT_TRUE(Forget(Changed("/srv/data")).ok());
  EXPECT_THAT(Expired("auth.unix.ip"), IsEmpty());
}

TEST_F(KernelExports, ForgetsTheAddressOfANewClient) {
  ExportTableUpdate update = Changed("/srv/data");
  update.clients = {"10.0.0.2", "2001:db8::1"};
  EXPECT_TRUE(Forget(update).ok());
  EXPECT_THAT(Expired("auth.unix.ip"),
              ElementsAre("nfsd 10.0.0.2 PAST", "nfsd 2001:db8:0000:0000:0000:0000:0000:0001 PAST"));
}

TEST_F(KernelExports, ForgetsEveryAddressForAClientThatMayHaveAny) {
  for (const char* client : {"10.0.0.0/8", "*", "*.example", "@group", "host.example"}) {
    caches_.Write("auth.unix.ip", "channel", "");
    ExportTableUpdate update = Changed("/srv/data");
    update.clients = {client};
    EXPECT_TRUE(Forget(update).ok());
    EXPECT_EQ(Expired("auth.unix.ip").size(), 4U) << client;
  }
}

TEST_F(KernelExports, FlushesTheRightsWhereAVolumeHasNoExportAnyMore) {
  ExportTableUpdate update = Changed("/no/such/folder");
  update.left = {"/no/such/folder"};
  EXPECT_TRUE(Forget(update).ok());
  EXPECT_TRUE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(KernelExports, DoesNotFlushWhereTheVolumeHasOtherExports) {
  folder_.Write("/a/file", "");
  folder_.Write("/b/file", "");
  ExportTableUpdate update = Changed(folder_.At("/a"));
  update.left = update.changed;
  update.exported = {folder_.At("/b")};
  EXPECT_TRUE(Forget(update).ok());
  EXPECT_FALSE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(KernelExports, ForgetsTheHandlesOfADirectoryThatHasLeft) {
  ExportTableUpdate update = Changed("/srv/data");
  update.left = {"/srv/data"};
  EXPECT_TRUE(Forget(update).ok());
  EXPECT_THAT(Expired("nfsd.fh"), testing::Contains("10.0.0.1 7 \\x0403020108070605"
                                                    "0c0b0a09100f0e0d14131211 PAST"));
}

// The kernel follows a directory that was renamed, and a client uses it with the handles that it has.
TEST_F(KernelExports, ForgetsTheRightsAndHandlesInADirectoryThatWasMoved) {
  caches_.Fill("nfsd.export",
               "/srv/data.old\t10.0.0.1(rw,sec=1)\n"
               "/srv/data/moved\t10.0.0.1(rw,sec=1)\n"
               "# /srv/gone\t10.0.0.1()\n"
               "/srv/database\t10.0.0.1(rw,sec=1)\n");
  caches_.Fill("nfsd.fh", "10.0.0.1 1 0x00000000 /srv/data.old\n10.0.0.1 1 0x01000000 /srv/database\n");
  EXPECT_TRUE(Forget(Changed("/volume")).ok());
  EXPECT_THAT(Expired("nfsd.export"), ElementsAre("10.0.0.1 /srv/data.old PAST", "10.0.0.1 /srv/data/moved PAST"));
  EXPECT_THAT(Expired("nfsd.fh"), ElementsAre("10.0.0.1 1 \\x00000000 PAST"));
}

TEST_F(KernelExports, KeepsTheRightsInAVolumeBelowAnExport) {
  caches_.Fill("nfsd.export", "/proc\t10.0.0.1(rw,crossmnt)\n");
  ExportTableUpdate update = Changed("/srv/data");
  update.exported = {"/"};
  EXPECT_TRUE(Forget(update).ok());
  EXPECT_THAT(Expired("nfsd.export"), IsEmpty());
}

TEST_F(KernelExports, UnderstandsWordsThatOnlyLookLikeEscapes) {
  for (const char* word : {"\\", "\\04", "\\09x", "\\x41", "a\\"}) EXPECT_EQ(UnescapeWord(word), word);
  EXPECT_EQ(UnescapeWord("a\\040b\\134\\011"), "a b\\\t");
}

TEST_F(KernelExports, FlushesACacheWhoseChannelCannotBeWritten) {
  ASSERT_EQ(std::remove((caches_.folder() + "/nfsd.fh/channel").c_str()), 0);
  caches_.Write("nfsd.fh", "channel/file", "");
  can_write_ = false;
  EXPECT_TRUE(Forget(Changed("/srv/data")).ok());
  EXPECT_TRUE(caches_.IsFlushed("nfsd.fh"));
  EXPECT_TRUE(caches_.IsFlushed("nfsd.export"));
}

TEST_F(KernelExports, FailsWithoutTheKernelsCaches) {
  EXPECT_FALSE(ForgetExports(folder_.At("/nowhere"), Changed("/srv/data"), nullptr).ok());
}

}  // namespace
}  // namespace vorn

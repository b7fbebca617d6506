// The findings about full file systems, on real ones. The tests run in namespaces of their own
// (private_network_main.cpp), in which a user without privileges may mount one.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "health.h"
#include "temporary_root.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

// A small file system below a root.
class Disk {
 public:
  Disk(std::string folder, const char* options) : folder_(std::move(folder)) {
    std::filesystem::create_directories(folder_);
    if (mount("disk", folder_.c_str(), "tmpfs", 0, options) == 0) return;
    throw std::system_error(errno, std::generic_category(), "a disk of our own");
  }
  ~Disk() { umount2(folder_.c_str(), MNT_DETACH); }
  Disk(const Disk&) = delete;
  Disk& operator=(const Disk&) = delete;

  void Fill() const {
    std::ofstream filler(folder_ + "/filler", std::ios::binary);
    const std::string page(4096, 'x');
    while (filler.write(page.data(), static_cast<std::streamsize>(page.size())).flush()) continue;
  }
  void UseUpInodes() const {
    for (int i = 0; std::ofstream(folder_ + "/" + std::to_string(i)); ++i) continue;
  }

 private:
  const std::string folder_;
};

std::vector<VORN::HealthFinding> FindFullDisks() {
  std::vector<VORN::HealthFinding> found;
  for (const VORN::HealthFinding& finding : VORN::CheckHealth().findings) {
    if (finding.kind == "full_file_system") found.push_back(finding);
  }
  return found;
}

constexpr char kSmall[] = "size=256k,nr_inodes=100";

TEST(FullFileSystems, OfSharesAreFound) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\nmore = /srv/data/more\n");
  const Disk disk(root.At("/srv/data"), kSmall);
  std::filesystem::create_directory(root.At("/srv/data/more"));
  EXPECT_THAT(FindFullDisks(), IsEmpty());
  disk.Fill();
  const std::vector<VORN::HealthFinding> found = FindFullDisks();
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_EQ(found[0].severity, VORN::HealthFinding::Severity::kError);
  EXPECT_EQ(found[0].subject.share, "data");
}

TEST(FullFileSystems, WithoutRoomForFilesAreFound) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/shares.conf", "[shares]\ndata = /srv/data\n");
  const Disk disk(root.At("/srv/data"), kSmall);
  disk.UseUpInodes();
  EXPECT_THAT(FindFullDisks(), SizeIs(1));
}

TEST(FullFileSystems, OfTheConfigurationAreFound) {
  const TemporaryRoot root;
  const Disk enough(root.At("/var/lib/vorn"), "size=32m");
  EXPECT_THAT(FindFullDisks(), IsEmpty());
  const Disk history(root.At("/var/lib/vorn"), "size=1m");
  const std::vector<VORN::HealthFinding> found = FindFullDisks();
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_EQ(found[0].subject.file, "/var/lib/vorn");
  EXPECT_THAT(found[0].text, HasSubstr("has 1 MiB of free space:"));
  const Disk files(root.At("/var/lib/vorn"), "size=32m,nr_inodes=10");
  files.UseUpInodes();
  ASSERT_THAT(FindFullDisks(), SizeIs(1));
  EXPECT_THAT(FindFullDisks()[0].text, HasSubstr("no room for another file"));
}

}  // namespace

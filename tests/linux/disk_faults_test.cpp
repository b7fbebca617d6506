// A real file system that is full or read-only, under every kind of change. The tests run in namespaces of their own
// (private_network_main.cpp), in which a user without privileges may mount one.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <stdexcept>
#include <system_error>

#include "captured_log.h"
#include "core.h"
#include "writes.h"

namespace {

using testing::Contains;
using testing::Field;
using testing::HasSubstr;
using testing::IsEmpty;

// A root that is a small file system.
class Disk {
 public:
  Disk() { Mount(0); }
  ~Disk() { umount2(root_.directory().c_str(), MNT_DETACH); }
  Disk(const Disk&) = delete;
  Disk& operator=(const Disk&) = delete;

  const TemporaryRoot& root() const { return root_; }

  void Fill() const {
    std::ofstream filler(root_.At("/filler"), std::ios::binary);
    const std::string page(4096, 'x');
    while (filler.write(page.data(), static_cast<std::streamsize>(page.size())).flush()) continue;
  }
  void FreeSpace() const { std::filesystem::remove(root_.At("/filler")); }

  void UseUpInodes() const {
    std::filesystem::create_directory(root_.At("/fillers"));
    for (int i = 0; std::ofstream(root_.At("/fillers/" + std::to_string(i))); ++i) continue;
  }
  void FreeInodes() const { std::filesystem::remove_all(root_.At("/fillers")); }

  void MakeReadOnly() const { Mount(MS_REMOUNT | MS_RDONLY); }
  void MakeWritable() const { Mount(MS_REMOUNT); }

 private:
  void Mount(unsigned long flags) const {
    if (mount("disk", root_.directory().c_str(), "tmpfs", flags, "size=256k,nr_inodes=100") == 0) return;
    throw std::system_error(errno, std::generic_category(), "a disk of our own");
  }

  const TemporaryRoot root_;
};

struct DiskFault {
  const char* name;
  int code;
  const char* reason;  // in the log
  void (Disk::*inject)() const;
  void (Disk::*recover)() const;
};

const DiskFault kDiskFaults[] = {
    {"full", ENOSPC, "No space left on device", &Disk::Fill, &Disk::FreeSpace},
    {"out of inodes", ENOSPC, "No space left on device", &Disk::UseUpInodes, &Disk::FreeInodes},
    {"read-only", EROFS, "Read-only file system", &Disk::MakeReadOnly, &Disk::MakeWritable},
};

using DiskFaults = Writes;

TEST_F(DiskFaults, LeaveTheOldFilesAloneUntilTheDiskRecovers) {
  int cases = 0;
  const size_t kinds = AllChanges(TemporaryRoot()).size();
  for (const DiskFault& fault : kDiskFaults) {
    for (size_t index = 0; index < kinds; ++index, ++cases) {
      const Disk disk;
      WriteAllFiles(disk.root());
      const Change change = AllChanges(disk.root())[index];
      SCOPED_TRACE(std::string("a disk that is ") + fault.name + ": " + change.name);
      const Contents before = ContentsOf(disk.root(), change);
      (disk.*fault.inject)();
      TakeLog();
      EXPECT_LT(change.make(), 0);
      EXPECT_EQ(KLIBCErrGet(), fault.code);
      EXPECT_THAT(TakeLog(), Contains(Field(&LogLine::text, HasSubstr(fault.reason))));
      EXPECT_EQ(ContentsOf(disk.root(), change), before);
      EXPECT_THAT(Leftovers(disk.root(), change), IsEmpty());
      (disk.*fault.recover)();
      EXPECT_GE(change.make(), 0);
      EXPECT_NE(ContentsOf(disk.root(), change), before);
    }
  }
  std::cout << "  " << cases << " cases\n";
}

}  // namespace

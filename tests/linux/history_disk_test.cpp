// The history on a file system of its own that is full or read-only. The tests run in namespaces of their own
// (private_network_main.cpp), in which a user without privileges may mount one.
#include <gmock/gmock.h>
#include <sys/mount.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <stdexcept>
#include <system_error>

#include "call.h"
#include "captured_log.h"
#include "change_history.h"
#include "core.h"
#include "history_support.h"
#include "processes.h"
#include "recovery.h"
#include "writes.h"

namespace vorn {
namespace {

using testing::AnyOf;
using testing::Contains;
using testing::Each;
using testing::ElementsAre;
using testing::Field;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;

constexpr char kFolder[] = "/var/lib/vorn";
constexpr char kFile[] = "/etc/exports";
constexpr char kOther[] = "/etc/nfs.conf.d/vorn.conf";

// A box that records its changes, with the folder of the history on a disk of its own.
class Disk {
 public:
  Disk() {
    std::filesystem::create_directories(root_.At(kFolder));
    Mount(0);
    WriteAllFiles(root_);
    root_.Write("/etc/vorn/platform.conf", "[platform]\nhistory = yes\n");
  }
  ~Disk() { umount2(root_.At(kFolder).c_str(), MNT_DETACH); }
  Disk(const Disk&) = delete;
  Disk& operator=(const Disk&) = delete;

  const TemporaryRoot& root() const { return root_; }

  void Fill() const {
    std::ofstream filler(At("/filler"), std::ios::binary);
    const std::string page(4096, 'x');
    while (filler.write(page.data(), static_cast<std::streamsize>(page.size())).flush()) continue;
  }
  void FreeSpace() const { std::filesystem::remove(At("/filler")); }

  void UseUpInodes() const {
    std::filesystem::create_directory(At("/fillers"));
    for (int i = 0; std::ofstream(At("/fillers/" + std::to_string(i))); ++i) continue;
  }
  void FreeInodes() const { std::filesystem::remove_all(At("/fillers")); }

  void MakeReadOnly() const { Mount(MS_REMOUNT | MS_RDONLY); }
  void MakeWritable() const { Mount(MS_REMOUNT); }

 private:
  std::string At(const std::string& path) const { return root_.At(kFolder) + path; }

  void Mount(unsigned long flags) const {
    if (mount("disk", root_.At(kFolder).c_str(), "tmpfs", flags, "size=2m,nr_inodes=300") == 0) return;
    throw std::system_error(errno, std::generic_category(), "a disk of our own");
  }

  const TemporaryRoot root_;
};

struct DiskFault {
  const char* name;
  void (Disk::*inject)() const;
  void (Disk::*recover)() const;
};

const DiskFault kDiskFaults[] = {{"full", &Disk::Fill, &Disk::FreeSpace},
                                 {"out of inodes", &Disk::UseUpInodes, &Disk::FreeInodes},
                                 {"read-only", &Disk::MakeReadOnly, &Disk::MakeWritable}};

VORN::CallDescription CallOf(const char* caller) {
  VORN::CallDescription call;
  call.caller = caller;
  call.method = "VORN.Core.FileServ.NFS/v1/set";
  return call;
}

// The later changes of these files, newest first: "KIND CALLER". No change is taken for an edit by hand.
std::vector<std::string> ChangesOf(const std::string& path) {
  std::vector<std::string> found;
  for (const History::Change& change : AllRecorded()) {
    EXPECT_NE(change.message.kind, kByHand);
    const std::vector<std::string>& files = change.message.files;
    if (change.message.kind == kFound || std::find(files.begin(), files.end(), path) == files.end()) continue;
    found.push_back(change.message.kind + " " + change.message.caller);
  }
  return found;
}

using HistoryDisk = Writes;

// All kinds of change whose files are on another disk than the history.
std::vector<Change> ChangesElsewhere(const TemporaryRoot& root) {
  std::vector<Change> changes = AllChanges(root);
  const auto is_here = [](const char* file) { return std::string(file).rfind(kFolder, 0) == 0; };
  changes.erase(std::remove_if(changes.begin(), changes.end(),
                               [&](const Change& change) {
                                 return std::any_of(change.files.begin(), change.files.end(), is_here);
                               }),
                changes.end());
  return changes;
}

TEST_F(HistoryDisk, FailsNoChangeAndTheNextOneIsRecorded) {
  int cases = 0;
  const std::size_t kinds = ChangesElsewhere(TemporaryRoot()).size();
  for (const DiskFault& fault : kDiskFaults) {
    for (std::size_t index = 0; index < 2 * kinds; ++index, ++cases) {
      const Disk disk;
      const Change change = ChangesElsewhere(disk.root())[index / 2];
      const bool with_history = index % 2 == 0;
      SCOPED_TRACE(std::string("a disk that is ") + fault.name + ": " + change.name + (with_history ? "" : ", new"));
      if (with_history) {
        ASSERT_EQ(VORN::RemoveLeftovers(), 0);
      }
      const Contents before = ContentsOf(disk.root(), change);
      (disk.*fault.inject)();
      TakeLog();
      {
        VORN::CallDescription description = CallOf("alice");
        description.uploads = {disk.root().At("/upload")};
        VORN::CallContext call(description);
        EXPECT_GE(change.make(), 0);
        call.End();
        EXPECT_THAT(call.warnings(), Contains(AnyOf(StartsWith("The history has no record of a change of "),
                                                    StartsWith("A change is not in the history yet"))));
      }
      EXPECT_THAT(TakeLog(), Contains(Field(&LogLine::text, HasSubstr("history"))));
      EXPECT_NE(ContentsOf(disk.root(), change), before);
      (disk.*fault.recover)();
      VORN::CallContext call(CallOf("bob"));
      for (const char* path : change.files) ASSERT_TRUE(SaveFile(path, "later\n").ok());
      call.End();
      EXPECT_THAT(call.warnings(), Each(Not(HasSubstr("history"))));
      for (const char* path : change.files) EXPECT_EQ(ChangesOf(path).front(), "change bob") << path;
      ExpectValidHistory(disk.root());
    }
  }
  std::cout << "  " << cases << " cases\n";
}

TEST_F(HistoryDisk, ThatFillsDuringAChangeHasTheChangeLater) {
  for (const DiskFault& fault : kDiskFaults) {
    SCOPED_TRACE(fault.name);
    const Disk disk;
    ASSERT_EQ(VORN::RemoveLeftovers(), 0);
    {
      VORN::CallContext call(CallOf("alice"));
      ASSERT_TRUE(SaveFile(kFile, "new\n").ok());
      (disk.*fault.inject)();
      call.End();
      EXPECT_THAT(call.warnings(), Contains(StartsWith("A change is not in the history yet")));
    }
    {
      VORN::CallContext call(CallOf("carol"));
      EXPECT_TRUE(SaveFile(kOther, "new\n").ok());
      call.End();
      EXPECT_THAT(call.warnings(), Contains(StartsWith("The history has no record of a change of ")));
    }
    (disk.*fault.recover)();
    {
      const VORN::CallContext call(CallOf("bob"));
      ASSERT_TRUE(SaveFile(kOther, "later\n").ok());
    }
    EXPECT_THAT(ChangesOf(kFile), ElementsAre("change alice"));
    EXPECT_THAT(ChangesOf(kOther), ElementsAre("change bob", "late "));
    ExpectValidHistory(disk.root());
  }
}

TEST_F(HistoryDisk, IsNotForgottenByAnotherProcess) {
  for (const DiskFault& fault : kDiskFaults) {
    SCOPED_TRACE(fault.name);
    const Disk disk;
    ASSERT_EQ(VORN::RemoveLeftovers(), 0);
    (disk.*fault.inject)();
    ChildProcess child([] { return SaveFile(kFile, "new\n").ok() ? 0 : 1; });
    EXPECT_EQ(child.Wait(), 0);
    TakeLog();
    (disk.*fault.recover)();
    ASSERT_TRUE(SaveFile(kOther, "later\n").ok());
    // A full disk may have room for a line of the journal.
    EXPECT_THAT(ChangesOf(kFile), ElementsAre(AnyOf("late ", StartsWith("change "))));
    disk.root().Write(kFile, "by hand\n");
    ASSERT_TRUE(SaveFile(kOther, "more\n").ok());
    const std::vector<History::Change> changes = AllRecorded();
    EXPECT_TRUE(std::any_of(changes.begin(), changes.end(),
                            [](const History::Change& change) { return change.message.kind == kByHand; }));
  }
}

}  // namespace
}  // namespace vorn

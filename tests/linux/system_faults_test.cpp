// Faults of the system, each under every kind of change: the change fails with a reason in the log, leaves the files as
// they were and no temporary file, and succeeds once the fault is gone.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/syscall.h>

#include <cerrno>
#include <csignal>
#include <filesystem>
#include <iostream>

#include "captured_log.h"
#include "injected_failures.h"
#include "processes.h"
#include "writes.h"

namespace {

using testing::IsEmpty;

void Limit(int resource, rlim_t value) {
  const rlimit limit{value, value};
  setrlimit(static_cast<__rlimit_resource>(resource), &limit);
}

struct Fault {
  const char* name;
  void (*inject)();  // called in the process that makes the change
};

const Fault kFaults[] = {
    {"a disk quota",
     [] {
       signal(SIGXFSZ, SIG_IGN);
       Limit(RLIMIT_FSIZE, 0);
     }},
    {"a disk that fails to write", [] { FailSystemCall(SYS_fsync, EIO); }},
    {"a read-only file system", [] { FailSystemCall(SYS_renameat2, EROFS); }},
    {"no permission to make files", [] { FailSystemCall(SYS_openat, EACCES); }},
    {"no permission to replace files", [] { FailSystemCall(SYS_renameat2, EACCES); }},
    {"no file descriptors", [] { Limit(RLIMIT_NOFILE, 3); }},
    {"no locks", [] { FailSystemCall(SYS_flock, ENOLCK); }},
};

// Makes the change under the fault in a child process. Returns whether it failed and logged a reason.
int MakeWithFault(const Fault& fault, const Change& change) {
  constexpr int kFailedWithReason = 1;
  ChildProcess process([&] {
    TakeLog();
    fault.inject();
    const bool failed = change.make() < 0;
    return failed && !TakeLog().empty() ? kFailedWithReason : 0;
  });
  return process.Wait() == kFailedWithReason;
}

using SystemFaults = Writes;

TEST_F(SystemFaults, FailTheChangeAndLeaveTheFilesUnchanged) {
  int cases = 0;
  const size_t kinds = AllChanges(TemporaryRoot()).size();
  for (const Fault& fault : kFaults) {
    for (size_t index = 0; index < kinds; ++index, ++cases) {
      const TemporaryRoot root;
      WriteAllFiles(root);
      const Change change = AllChanges(root)[index];
      const Contents before = ContentsOf(root, change);
      EXPECT_TRUE(MakeWithFault(fault, change)) << fault.name << ": " << change.name;
      EXPECT_EQ(ContentsOf(root, change), before) << fault.name << ": " << change.name;
      EXPECT_THAT(Leftovers(root, change), IsEmpty()) << fault.name << ": " << change.name;
      EXPECT_GE(change.make(), 0) << fault.name << ": " << change.name << ": after the fault";
      EXPECT_NE(ContentsOf(root, change), before) << fault.name << ": " << change.name;
    }
  }
  std::cout << "  " << cases << " cases\n";
}

struct Obstacle {
  const char* name;
  void (*place)(const std::string& path);
};

const Obstacle kObstacles[] = {
    {"a folder", [](const std::string& path) { std::filesystem::create_directory(path); }},
    {"a link to itself",
     [](const std::string& path) { std::filesystem::create_symlink(std::filesystem::path(path).filename(), path); }},
    {"a pipe", [](const std::string& path) { mkfifo(path.c_str(), 0600); }},
};

TEST_F(SystemFaults, IncludeAPathThatIsNoRegularFile) {
  const size_t kinds = AllChanges(TemporaryRoot()).size();
  for (const Obstacle& obstacle : kObstacles) {
    for (size_t index = 0; index < kinds; ++index) {
      const TemporaryRoot root;
      WriteAllFiles(root);
      const Change change = AllChanges(root)[index];
      const std::string path = root.At(change.files.front());
      std::filesystem::remove_all(path);
      obstacle.place(path);
      TakeLog();
      EXPECT_LT(change.make(), 0) << obstacle.name << ": " << change.name;
      EXPECT_FALSE(TakeLog().empty()) << obstacle.name << ": " << change.name;
      EXPECT_FALSE(std::filesystem::is_regular_file(std::filesystem::symlink_status(path))) << obstacle.name;
      EXPECT_THAT(Leftovers(root, change), IsEmpty()) << obstacle.name << ": " << change.name;
    }
  }
}

TEST_F(SystemFaults, DoNotIncludeMissingFolders) {
  int made = 0;
  for (size_t index = 0; index < AllChanges(TemporaryRoot()).size(); ++index) {
    const TemporaryRoot root;
    WriteForeignFiles(root);
    const Change change = AllChanges(root)[index];
    EXPECT_GE(change.make(), 0) << change.name;
    for (const auto& [path, text] : ContentsOf(root, change)) made += text ? 1 : 0;
  }
  EXPECT_EQ(made, 11) << "every file except those of the two removals";
}

}  // namespace

#include "configuration_lock.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/file.h>

#include <cerrno>
#include <fstream>
#include <list>
#include <memory>
#include <thread>

#include "current_box.h"
#include "file_descriptor.h"
#include "file_lock_waiters.h"
#include "processes.h"
#include "temporary_root.h"

namespace vorn {
namespace {

constexpr char kLockFile[] = "/run/vorn/config.lock";

// Returns whether any process owns the root's lock.
bool IsHeld(const TemporaryRoot& root) {
  const FileDescriptor file(open(root.At(kLockFile).c_str(), O_RDWR | O_CLOEXEC));
  return file && flock(file.get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK;
}

// Increments the number in a file by an unprotected read and write.
void Increment(const std::string& path) {
  int number = 0;
  std::ifstream(path) >> number;
  std::ofstream(path) << number + 1;
}

TEST(ConfigurationLock, IsHeldWhileTheObjectLives) {
  const TemporaryRoot root;
  {
    const ConfigurationLock lock(CurrentBox());
    ASSERT_TRUE(lock.status().ok()) << lock.status().reason();
    EXPECT_TRUE(IsHeld(root));
  }
  EXPECT_FALSE(IsHeld(root));
}

TEST(ConfigurationLock, NestsWithinAThread) {
  const TemporaryRoot root;
  auto outer = std::make_unique<ConfigurationLock>(CurrentBox());
  auto inner = std::make_unique<ConfigurationLock>(CurrentBox());
  ASSERT_TRUE(inner->status().ok());
  outer.reset();
  EXPECT_TRUE(IsHeld(root));
  inner.reset();
  EXPECT_FALSE(IsHeld(root));
}

TEST(ConfigurationLock, LosesNoWriteOfProcessesAndTheirThreads) {
  const TemporaryRoot root;
  root.Write("/number", "0");
  const auto write_many = [&] {
    for (int i = 0; i < 50; ++i) {
      const ConfigurationLock lock(CurrentBox());
      Increment(root.At("/number"));
    }
  };
  const auto write_in_threads = [&] {
    std::thread other(write_many);
    write_many();
    other.join();
    return 0;
  };
  std::list<ChildProcess> children;
  for (int i = 0; i < 4; ++i) children.emplace_back(write_in_threads);
  for (ChildProcess& child : children) EXPECT_EQ(child.Wait(), 0);
  EXPECT_EQ(root.Read("/number"), "400");
}

TEST(ConfigurationLock, OfAKilledHolderIsFree) {
  const TemporaryRoot root;
  ChildProcess holder([&]() -> int {
    const ConfigurationLock lock(CurrentBox());
    root.Write("/held", "");
    for (;;) pause();
  });
  ASSERT_TRUE(Eventually([&] { return root.Read("/held").has_value(); }));
  ASSERT_TRUE(IsHeld(root));
  holder.Kill();
  holder.Wait();
  const ConfigurationLock lock(CurrentBox());
  EXPECT_TRUE(lock.status().ok());
}

TEST(ConfigurationLock, IsOnePerRoot) {
  const TemporaryRoot first;
  const ConfigurationLock first_lock(CurrentBox());
  const TemporaryRoot second;
  EXPECT_FALSE(IsHeld(second));
  const ConfigurationLock second_lock(CurrentBox());
  EXPECT_TRUE(second_lock.status().ok());
  EXPECT_TRUE(IsHeld(first));
  EXPECT_TRUE(IsHeld(second));
}

TEST(ConfigurationLock, MovesToANewFileWhenItsOwnWasRemoved) {
  const TemporaryRoot root;
  ChildProcess waiter([&] {
    if (!Eventually([&] { return IsHeld(root); })) return 1;
    const ConfigurationLock lock(CurrentBox());
    return IsHeld(root) ? 0 : 2;
  });
  {
    const ConfigurationLock lock(CurrentBox());
    ASSERT_TRUE(Eventually([&] { return HasLockWaiter(root.At(kLockFile)); }));
    unlink(root.At(kLockFile).c_str());
  }
  EXPECT_EQ(waiter.Wait(), 0);
}

TEST(ConfigurationLock, WaitsNoLongerThanItsLimit) {
  EXPECT_LT(kConfigurationLockLimit, std::chrono::seconds(60)) << "vornd answers after 60 s without the reason";
  const TemporaryRoot root;
  ChildProcess holder([&]() -> int {
    const ConfigurationLock lock(CurrentBox());
    root.Write("/held", "");
    for (;;) pause();
  });
  ASSERT_TRUE(Eventually([&] { return root.Read("/held").has_value(); }));
  {
    const ConfigurationLock lock(CurrentBox(), std::chrono::milliseconds(50));
    EXPECT_EQ(lock.status().code(), kLockTimeout);
  }
  holder.Kill();
  holder.Wait();
}

TEST(ConfigurationLock, SaysWhyItIsNotHeld) {
  const TemporaryRoot root;
  root.Write("/run", "a file where a folder must be");
  const ConfigurationLock lock(CurrentBox());
  EXPECT_EQ(lock.status().code(), ENOTDIR);
  EXPECT_NE(lock.status().reason().find("/run"), std::string::npos);
}

TEST(LockPause, LetsOthersInAndTakesTheLockAgain) {
  const TemporaryRoot root;
  const ConfigurationLock outer(CurrentBox());
  const ConfigurationLock inner(CurrentBox());
  {
    const LockPause pause;
    EXPECT_FALSE(IsHeld(root));
    const LockPause nested;
    EXPECT_FALSE(IsHeld(root));
  }
  EXPECT_TRUE(IsHeld(root));
}

TEST(LockPause, WithoutALockChangesNothing) {
  const TemporaryRoot root;
  { const LockPause pause; }
  EXPECT_FALSE(IsHeld(root));
}

TEST(LockPause, ALockTakenWithinEndsWithin) {
  const TemporaryRoot root;
  const ConfigurationLock outer(CurrentBox());
  const LockPause pause;
  {
    const ConfigurationLock lock(CurrentBox());
    EXPECT_TRUE(IsHeld(root));
    {
      const LockPause nested;
      EXPECT_FALSE(IsHeld(root));
    }
    EXPECT_TRUE(IsHeld(root));
  }
  EXPECT_FALSE(IsHeld(root));
}

TEST(LockPause, CoversEveryRootThatTheThreadHolds) {
  const TemporaryRoot first;
  const ConfigurationLock first_lock(CurrentBox());
  const TemporaryRoot second;
  const ConfigurationLock second_lock(CurrentBox());
  {
    const LockPause pause;
    EXPECT_FALSE(IsHeld(first));
    EXPECT_FALSE(IsHeld(second));
  }
  EXPECT_TRUE(IsHeld(first));
  EXPECT_TRUE(IsHeld(second));
}

TEST(LockPause, EndsInTheOrderTakenSoThatNestedRootsNeverWaitForEachOther) {
  const TemporaryRoot first;
  const TemporaryRoot second;
  ChildProcess other([&] {
    if (!Eventually([&] { return first.Read("/go").has_value(); })) return 1;
    const FileDescriptor file(open(first.At(kLockFile).c_str(), O_RDWR | O_CLOEXEC));
    if (flock(file.get(), LOCK_EX) != 0) return 2;
    first.Write("/held", "");
    if (!Eventually([&] { return HasLockWaiter(first.At(kLockFile)); })) return 3;
    return IsHeld(second) ? 4 : 0;
  });
  setenv("VORN_ROOT", first.directory().c_str(), 1);
  const ConfigurationLock first_lock(CurrentBox());
  setenv("VORN_ROOT", second.directory().c_str(), 1);
  const ConfigurationLock second_lock(CurrentBox());
  {
    const LockPause pause;
    first.Write("/go", "");
    ASSERT_TRUE(Eventually([&] { return first.Read("/held").has_value(); }));
  }
  EXPECT_EQ(other.Wait(), 0);
  EXPECT_TRUE(IsHeld(first));
  EXPECT_TRUE(IsHeld(second));
}

TEST(LockPause, ALockThatCannotBeHadAgainFailsForThoseWhoNest) {
  const TemporaryRoot root;
  const ConfigurationLock outer(CurrentBox());
  {
    const LockPause pause;
    ASSERT_EQ(rename(root.At("/run").c_str(), root.At("/gone").c_str()), 0);
    root.Write("/run", "a file where a folder must be");
  }
  EXPECT_EQ(ConfigurationLock(CurrentBox()).status().code(), ENOTDIR);
  unlink(root.At("/run").c_str());
  EXPECT_TRUE(ConfigurationLock(CurrentBox()).status().ok());
  EXPECT_TRUE(IsHeld(root));
}

}  // namespace
}  // namespace vorn

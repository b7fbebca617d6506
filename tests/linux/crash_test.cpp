// A process is killed at each system call of a change; another process must be able to continue.
#include <gmock/gmock.h>
#include <sys/mman.h>

#include <iostream>

#include "injected_failures.h"
#include "writes.h"

namespace {

using testing::AnyOf;
using testing::Eq;
using testing::IsEmpty;

// A flag in shared memory, which a child can set and which outlives it.
class SharedFlag {
 public:
  SharedFlag()
      : flag_(static_cast<volatile bool*>(
            mmap(nullptr, sizeof(bool), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0))) {}
  ~SharedFlag() { munmap(const_cast<bool*>(flag_), sizeof(bool)); }
  SharedFlag(const SharedFlag&) = delete;
  SharedFlag& operator=(const SharedFlag&) = delete;

  void Set() const { *flag_ = true; }
  bool IsSet() const { return *flag_; }

 private:
  volatile bool* const flag_;
};

// The function that creates the files, and the index of the change that is made.
struct Case {
  void (*write_files)(const TemporaryRoot& root);
  size_t index;

  Change On(const TemporaryRoot& root) const {
    write_files(root);
    return AllChanges(root)[index];
  }
};

// The contents after an undisturbed change. Other tests check that the readers of the files understand them.
Contents After(const Case& test) {
  const TemporaryRoot root;
  const Change change = test.On(root);
  EXPECT_GE(change.make(), 0) << change.name;
  return ContentsOf(root, change);
}

// Kills the change at its system call number `count`. Returns false if it made fewer calls.
bool KilledAt(int count, const Case& test, const Contents& done) {
  const TemporaryRoot root;
  const Change change = test.On(root);
  const Contents before = ContentsOf(root, change);
  const SharedFlag acknowledged;
  const bool ended = RunUntilSystemCall(count, [&] {
    if (change.make() >= 0) acknowledged.Set();
  });
  const Contents now = ContentsOf(root, change);
  for (const char* file : change.files) {
    EXPECT_THAT(now.at(file), AnyOf(Eq(before.at(file)), Eq(done.at(file)))) << change.name << ", call " << count;
  }
  if (acknowledged.IsSet()) {
    EXPECT_EQ(now, done) << change.name << ", call " << count;
  }
  EXPECT_GE(change.make(), 0) << change.name << ", call " << count << ": the next one cannot";
  EXPECT_EQ(ContentsOf(root, change), done) << change.name << ", call " << count;
  EXPECT_THAT(Leftovers(root, change), IsEmpty()) << change.name << ", call " << count;
  return !ended;
}

// Kills the change at each of its system calls in turn. Returns their number.
int KillAtEachCall(const Case& test) {
  const Contents done = After(test);
  int count = 0;
  while (KilledAt(count, test, done) && !testing::Test::HasFailure()) ++count;
  return count;
}

Contents Before(const Case& test) {
  const TemporaryRoot root;
  const Change change = test.On(root);
  return ContentsOf(root, change);
}

using Crash = Writes;

TEST_F(Crash, LeavesTheOldFilesOrTheNewOnesAndNoObstacle) {
  int kills = 0;
  const size_t kinds = AllChanges(TemporaryRoot()).size();
  for (size_t index = 0; index < kinds; ++index) {
    const Case test{WriteAllFiles, index};
    const char* name = AllChanges(TemporaryRoot())[index].name;
    for (const auto& [path, text] : After(test)) EXPECT_NE(text, Before(test).at(path)) << name << ": " << path;
    const int calls = KillAtEachCall(test);
    EXPECT_GT(calls, 10) << name << " is not seen to make system calls";
    std::cout << "  " << name << ": killed at each of " << calls << " system calls\n";
    kills += calls;
  }
  std::cout << "  " << kinds << " kinds of change, " << kills << " kills\n";
}

TEST_F(Crash, OfAFirstChangeLeavesNoFilesOrWholeOnes) {
  int kinds = 0;
  int kills = 0;
  for (size_t index = 0; index < AllChanges(TemporaryRoot()).size(); ++index) {
    const Case test{WriteForeignFiles, index};
    if (After(test) == Before(test)) continue;
    ++kinds;
    kills += KillAtEachCall(test);
  }
  EXPECT_GE(kinds, 8) << "the removals alone find nothing to do";
  std::cout << "  " << kinds << " kinds of change, " << kills << " kills\n";
}

}  // namespace

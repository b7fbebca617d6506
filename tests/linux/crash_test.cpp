// A process that dies at any moment of a change, and another one that goes on.
#include <gmock/gmock.h>
#include <sys/mman.h>

#include <iostream>

#include "injected_failures.h"
#include "writes.h"

namespace {

using testing::AnyOf;
using testing::Eq;
using testing::IsEmpty;

// One word that a child leaves for its parent, whatever becomes of it.
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

Contents After(size_t index) {
  const TemporaryRoot root;
  FurnishFiles(root);
  const Change change = AllChanges(root)[index];
  EXPECT_GE(change.make(), 0) << change.name;
  return ContentsOf(root, change);
}

// Kills the change at its system call number `count`. False when it ended before that.
bool KilledAt(int count, size_t index, const Contents& done) {
  const TemporaryRoot root;
  FurnishFiles(root);
  const Change change = AllChanges(root)[index];
  const Contents before = ContentsOf(root, change);
  const SharedFlag acknowledged;
  const bool ended = RunUntilSystemCall(count, [&] {
    if (change.make() >= 0) acknowledged.Set();
  });
  const Contents now = ContentsOf(root, change);
  for (const char* file : change.files) {
    EXPECT_THAT(now.at(file), AnyOf(Eq(before.at(file)), Eq(done.at(file)))) << change.name << ", call " << count;
    EXPECT_NE(before.at(file), done.at(file)) << change.name;
  }
  if (acknowledged.IsSet()) {
    EXPECT_EQ(now, done) << change.name << ", call " << count;
  }
  EXPECT_GE(change.make(), 0) << change.name << ", call " << count << ": the next one cannot";
  EXPECT_EQ(ContentsOf(root, change), done) << change.name << ", call " << count;
  EXPECT_THAT(Leftovers(root, change), IsEmpty()) << change.name << ", call " << count;
  return !ended;
}

TEST(Crash, LeavesTheOldFilesOrTheNewOnesAndNothingInTheWay) {
  int kills = 0;
  const size_t kinds = AllChanges(TemporaryRoot()).size();
  for (size_t index = 0; index < kinds; ++index) {
    const Contents done = After(index);
    int count = 0;
    while (KilledAt(count, index, done) && !HasFailure()) ++count;
    EXPECT_GT(count, 10) << "the change is not seen to make system calls";
    std::cout << "  " << AllChanges(TemporaryRoot())[index].name << ": killed at each of " << count
              << " system calls\n";
    kills += count;
  }
  std::cout << "  " << kills << " kills\n";
}

}  // namespace

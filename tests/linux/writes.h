// Every kind of change that the contract writes to the box's files, for the tests that hurt them all.
#ifndef VORN_TESTS_LINUX_WRITES_H
#define VORN_TESTS_LINUX_WRITES_H

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "temporary_root.h"

// Their roots are in memory: nothing here depends on a disk but the time it takes.
class Writes : public testing::Test {
 protected:
  static void SetUpTestSuite() { setenv("TMPDIR", "/dev/shm", 1); }
};

struct Change {
  const char* name;
  std::function<int()> make;       // what the operation answers: negative on failure
  std::vector<const char*> files;  // that it writes, below the root
};

// The changes; on the box of FurnishFiles() each of them alters each of its files.
std::vector<Change> AllChanges(const TemporaryRoot& root);

// A box whose files all exist, an administrator's lines in them.
void FurnishFiles(const TemporaryRoot& root);

// A box where nothing of ours was ever written; the changes that take something away have nothing to do there.
void LeaveFilesToBeMade(const TemporaryRoot& root);

using Contents = std::map<std::string, std::optional<std::string>>;  // by path; none where there is no file

// Returns the contents of the files of a change.
Contents ContentsOf(const TemporaryRoot& root, const Change& change);

// The temporary files in the folders of the files of a change.
std::vector<std::string> Leftovers(const TemporaryRoot& root, const Change& change);

#endif  // VORN_TESTS_LINUX_WRITES_H

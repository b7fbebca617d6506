// Every kind of change that the contract writes to the box's files, for tests that disturb each of them.
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

// Base of these tests. Their roots are in memory, because a disk would only make the tests slower.
class Writes : public testing::Test {
 protected:
  static void SetUpTestSuite() { setenv("TMPDIR", "/dev/shm", 1); }
};

struct Change {
  const char* name;
  std::function<int()> make;       // returns the result of the operation; negative on failure
  std::vector<const char*> files;  // the files that it writes, below the root
};

// Returns all kinds of change. After WriteAllFiles() each of them alters each of its files.
std::vector<Change> AllChanges(const TemporaryRoot& root);

// Creates all files, with lines of an administrator in them.
void WriteAllFiles(const TemporaryRoot& root);

// Creates only the files that are not written by the platform. The changes that remove something have no effect then.
void WriteForeignFiles(const TemporaryRoot& root);

using Contents = std::map<std::string, std::optional<std::string>>;  // by path; nullopt for a missing file

// Returns the contents of the files of a change.
Contents ContentsOf(const TemporaryRoot& root, const Change& change);

// Returns the temporary files in the folders of the files of a change.
std::vector<std::string> Leftovers(const TemporaryRoot& root, const Change& change);

#endif  // VORN_TESTS_LINUX_WRITES_H

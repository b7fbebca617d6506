// The parts that the tests of the history share: saves of files, and the changes that the history has.
#ifndef VORN_TESTS_LINUX_HISTORY_SUPPORT_H
#define VORN_TESTS_LINUX_HISTORY_SUPPORT_H

#include <string>
#include <vector>

#include "change_history.h"
#include "status.h"
#include "temporary_root.h"

namespace vorn {

// Replaces the file of the box at `path`, whatever it has, under the configuration lock.
Status SaveFile(const std::string& path, const std::string& text);

// Returns all changes of the box's history, newest first. A history that cannot be read fails the test.
std::vector<History::Change> AllRecorded();

// Fails the test if git-fsck(1) has something to say about the repository below the root. `context` is added to it.
void ExpectValidHistory(const TemporaryRoot& root, const std::string& context = "");

}  // namespace vorn

#endif  // VORN_TESTS_LINUX_HISTORY_SUPPORT_H

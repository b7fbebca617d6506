#include "history_support.h"

#include <gtest/gtest.h>

#include "configuration_lock.h"
#include "current_box.h"
#include "processes.h"

namespace vorn {

Status SaveFile(const std::string& path, const std::string& text) {
  Box& box = RealBox();
  const ConfigurationLock lock(box);
  const Result<StoredFile> before = box.Read(path);
  return before.ok() ? box.Replace(path, text, before->version) : before.status();
}

std::vector<History::Change> AllRecorded() {
  std::vector<History::Change> changes;
  const Status status = RealHistory().Walk([&](const History::Change& change) {
    changes.push_back(change);
    return true;
  });
  EXPECT_TRUE(status.ok()) << status.reason();
  return changes;
}

void ExpectValidHistory(const TemporaryRoot& root, const std::string& context) {
  const ProgramResult result =
      RunProgram({"git", "--git-dir", root.At(kHistoryFolder), "fsck", "--full", "--strict", "--no-dangling"});
  EXPECT_EQ(result.status, 0) << result.output << result.errors << context;
}

}  // namespace vorn

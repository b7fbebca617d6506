// A process is killed at each system call of a change. The history attributes the change to its caller, never to an
// edit by hand.
#include <gmock/gmock.h>

#include <iostream>

#include "call.h"
#include "captured_log.h"
#include "change_history.h"
#include "configuration_lock.h"
#include "core.h"
#include "current_box.h"
#include "history_support.h"
#include "injected_failures.h"
#include "recovery.h"
#include "writes.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/exports";
constexpr char kOther[] = "/etc/nfs.conf.d/vorn.conf";

void ChangeTwoFiles() {
  VORN::CallDescription description;
  description.caller = "alice";
  description.method = "two files";
  const VORN::CallContext call(description);
  const ConfigurationLock lock(RealBox());
  static_cast<void>(SaveFile(kFile, "new\n").ok() && SaveFile(kOther, "new\n").ok() && KLIBServiceReload("nfsd") == 0);
}

// The contents of a file over the history, newest first, and who changed it.
void ExpectAttributed(const TemporaryRoot& root, int count) {
  for (const char* path : {kFile, kOther}) {
    const std::string now = root.Read(path).value();
    int changes = 0;
    for (const History::Change& change : AllRecorded()) {
      EXPECT_NE(change.message.kind, kByHand) << "call " << count;
      if (change.message.kind != kByCall) continue;
      EXPECT_EQ(change.message.caller, "alice") << "call " << count;
      for (const std::string& file : change.message.files) changes += file == path ? 1 : 0;
    }
    EXPECT_EQ(changes, now == "new\n" ? 1 : 0) << path << ", call " << count;
  }
}

// Kills the change at its system call number `count`. Returns false if it made fewer calls. `with_history`: there is
// a history already.
bool KilledAt(int count, bool with_history) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nhistory = yes\n");
  root.Write(kFile, "old\n");
  root.Write(kOther, "old\n");
  if (with_history) {
    EXPECT_EQ(VORN::RemoveLeftovers(), 0);
  }
  const bool ended = RunUntilSystemCall(count, ChangeTwoFiles);
  TakeLog();
  EXPECT_EQ(VORN::RemoveLeftovers(), 0) << "call " << count;
  for (const LogLine& line : TakeLog()) ADD_FAILURE() << line.text << ", call " << count;
  ExpectAttributed(root, count);
  if (count % 16 == 0) ExpectValidHistory(root, ", call " + std::to_string(count));
  return !ended;
}

using HistoryCrash = Writes;

TEST_F(HistoryCrash, IsNeverTakenForAnEditByHand) {
  for (const bool with_history : {true, false}) {
    int count = 0;
    while (KilledAt(count, with_history) && !HasFailure()) ++count;
    EXPECT_GT(count, 50);
    std::cout << "  killed at each of " << count << " system calls\n";
  }
}

}  // namespace
}  // namespace vorn

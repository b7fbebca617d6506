// The history of the fake platform.
#include "fake_platform.h"
#include "history.h"

namespace VORN {

int ListHistory(const HistoryFilter& filter, int offset, int limit, std::vector<HistoryEntry>* entries, int* total) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string arguments = "'" + filter.file + "' '" + filter.method + "' '" + filter.caller + "' " +
                                std::to_string(filter.since) + " " + std::to_string(filter.until) + " " +
                                std::to_string(offset) + " " + std::to_string(limit);
  if (platform.Fails("ListHistory", arguments)) return platform.FailureResult("ListHistory");
  *entries = {platform.change};
  *total = 1;
  return 0;
}

int ShowHistory(const std::string& id, HistoryEntry* entry, std::vector<HistoryFile>* files) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("ShowHistory", id)) return platform.FailureResult("ShowHistory");
  *entry = platform.change;
  *files = {{"/etc/exports", "-a\n+b\n"}};
  return 0;
}

int UndoChange(const std::string& id, std::vector<std::string>* files) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("UndoChange", id)) return platform.FailureResult("UndoChange");
  *files = platform.change.files;
  return 0;
}

}  // namespace VORN

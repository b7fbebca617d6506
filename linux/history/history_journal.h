// The journal of the history: what it needs to survive a crash.
#ifndef VORN_LINUX_HISTORY_HISTORY_JOURNAL_H
#define VORN_LINUX_HISTORY_HISTORY_JOURNAL_H

#include <sys/types.h>

#include <string>
#include <vector>

#include "status.h"

namespace vorn {

// An append-only file. Commits reach the repository without fsync(2), so that a change costs one sync, of its record
// here. A checkpoint makes the repository durable and begins a new journal. After a crash of the system the commits
// since the checkpoint are made again from the journal. Two objects for one file, in one process or several, exclude
// each other by the configuration lock.
class HistoryJournal {
 public:
  struct Record {
    enum class Kind : char { kCheckpoint = 'b', kIntent = 'i', kDropped = 'd', kCommit = 'c' };
    Kind kind;
    std::vector<std::string> fields;
  };

  // `location` is a path of this system.
  explicit HistoryJournal(std::string location) : location_(std::move(location)) {}

  // The records that were appended since the last call, by any process. All records if another process has begun a
  // new journal; `*is_new` says so. A missing file has no records. An incomplete record at the end, of a writer that
  // was killed, is cut off.
  Result<std::vector<Record>> ReadNew(bool* is_new);

  // Appends a record. With `durable` it is on the disk afterwards: fdatasync(2).
  Status Append(const Record& record, bool durable);

  // Begins a new journal with one record, which no earlier journal had, atomically and durably.
  Status Restart(const Record& record);

  off_t size() const { return read_; }

 private:
  Status Truncate(off_t size) const;

  std::string location_;
  std::string first_;  // the first record, as it is in the file: no other journal begins with it
  off_t read_ = 0;     // the end of the records that were read or written
};

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_HISTORY_JOURNAL_H

// The table of what is exported, which exportfs(8) and this platform write and rpc.mountd(8) reads.
#ifndef VORN_LINUX_SERVICE_EXPORT_TABLE_FILE_H
#define VORN_LINUX_SERVICE_EXPORT_TABLE_FILE_H

#include <string>

#include "box.h"
#include "file_descriptor.h"
#include "status.h"

namespace vorn {

// The table, locked: exportfs(8) neither reads nor writes it while the object exists. Both locks of exportfs are
// taken: the one of a whole run (export-lock), and the one for a single access to the table (.etab.lock).
class ExportTableFile {
 public:
  // Waits for the locks, for 30 s at most. A table that does not exist is empty.
  static Result<ExportTableFile> Open(Box& box);

  const std::string& text() const { return text_; }

  // Replaces the table in one step. It is not made durable: each start of the service writes it anew.
  Status Replace(const std::string& text);

 private:
  ExportTableFile() = default;

  std::string path_;
  std::string text_;
  FileDescriptor run_lock_;
  FileDescriptor table_lock_;
};

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_EXPORT_TABLE_FILE_H

// The files of exports(5) on a box: /etc/exports, and /etc/exports.d/*.exports, which is read and never written.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_FILES_H
#define VORN_LINUX_EXPORTS_EXPORTS_FILES_H

#include <cstddef>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "box.h"
#include "exports_document.h"
#include "status.h"

namespace vorn {

constexpr char kExportsFile[] = "/etc/exports";

// One version of one file.
struct ExportsFile {
  std::string path;      // on the box
  std::string location;  // on this system, for messages
  Version version;
  ExportsDocument document;

  // Returns what to call a position of the text in a message: "/etc/exports:12:7".
  std::string Place(std::size_t position) const { return location + ":" + document.Place(position); }
};

// Any number of threads may share it.
using SharedExportsFile = std::shared_ptr<const ExportsFile>;

// Reads one file. A file that does not exist reads as an empty one.
Result<SharedExportsFile> OpenExportsFile(Box& box, const std::string& path);

// Reads all files in the order of exportfs(8), for which the first rule of a client counts: /etc/exports, then the
// others in the order of strverscmp(3). Like exportfs, it ignores other names and everything but regular files.
Result<std::vector<SharedExportsFile>> OpenAllExports(Box& box);

// A fault of a file, for an administrator.
struct ExportsFileFault {
  std::string file;       // its location
  std::string path;       // the directory of the faulty line, as far as it can be read
  std::size_t begin = 0;  // where the faulty line is in the file's text, with its continuations
  std::size_t end = 0;
  std::string sentence;    // file, line, column and reason: "/etc/exports:3:9: no such export option: \"foo\""
  bool ends_file = false;  // see ExportFault
};

// Checks every line of `files`. Empty if exportfs(8) reads all of them to the end. Hosts that the resolver does not
// know, and directories that do not exist, are no faults: exportfs skips those and reads on.
std::vector<ExportsFileFault> FindExportFaults(const std::vector<SharedExportsFile>& files);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_FILES_H

// Which export rule decides over an access.
#ifndef VORN_LINUX_ACCESS_EXPORT_DECISION_H
#define VORN_LINUX_ACCESS_EXPORT_DECISION_H

#include <cstddef>
#include <functional>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "exports_options.h"

namespace vorn {

// The kinds of clients in the order in which rpc.mountd(8) searches them, whatever the order of the files.
enum class ExportKind { kHost, kNetwork, kPattern, kNetgroup, kEverybody };

ExportKind ExportKindOf(const std::string& client);

// The name of a kind in VORN::AccessRule.
const char* NameOf(ExportKind kind);

// One client of one directory in the table of exports.
struct TableExport {
  std::string directory;
  std::string client;  // as the table has it
  ExportKind kind = ExportKind::kHost;
  ExportOptions options;

  // Where it is written: a file of exports(5) and a line from 1, with the client as it is written there. `file` is
  // empty if no file has it.
  std::string file;
  int line = 0;
  std::string written;
};

// In the order of the table.
using ExportList = std::vector<TableExport>;

struct ExportQuestion {
  std::string directory;                            // absolute, without links
  bool is_version_4 = true;                         // otherwise version 3
  std::set<std::string> mount_points;               // directories at which a file system is mounted
  std::function<bool(const TableExport&)> matches;  // whether the client is one of the export's clients
};

struct ExportDecision {
  enum class Outcome {
    kNone,     // no rule admits the client
    kRule,     // `decider` decides
    kPassage,  // NFSv4 shows the directory only as the way to exported directories inside it
    kHidden,   // the client sees the directory over which the file system of the share is mounted
    kFolder    // version 3: the rule of an outer directory on another file system does not admit to this one
  };
  struct Other {
    enum class Reason {
      kKind,      // a rule of an earlier kind decides
      kOrder,     // an earlier rule of this kind decides
      kDirectory  // the rule of another directory decides
    };
    std::size_t index;
    Reason reason;
  };

  Outcome outcome = Outcome::kNone;
  std::optional<std::size_t> decider;  // an index of the list; also with kHidden and kFolder
  std::vector<Other> others;           // the other rules of the directory, or of an outer one, that match the client
};

// Decides as rpc.mountd(8) of nfs-utils 2.6 and nfsd do:
//  - Of the rules of one directory the first one of the earliest kind counts.
//  - Version 3: the directory's own rules, else those of the nearest outer directory that has a rule for the client.
//  - Version 4: a client walks down from the root. The first directory on the way with a rule for the client decides
//    over everything inside it, up to a mount point whose own rules admit the client.
ExportDecision DecideExport(const ExportList& exports, const ExportQuestion& question);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_EXPORT_DECISION_H

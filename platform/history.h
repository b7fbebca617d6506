// The history of the box: who changed which of its files. Our own addition to the contract: the API
// "VORN.Core.FileServ.NFS.History" needs it. The operations are C++ functions with values that belong to the caller.
// Thread-safe. All strings are valid UTF-8.
#ifndef VORN_PLATFORM_HISTORY_H
#define VORN_PLATFORM_HISTORY_H

#include <cstdint>
#include <string>
#include <vector>

namespace VORN {

// A change of files, or an operation on the service, or both.
struct HistoryEntry {
  std::string id;         // 40 hexadecimal digits: the commit of the change in the repository of the history
  std::int64_t time = 0;  // seconds since the epoch; of an edit by hand: when it was found
  // "change"; "undo"; "by hand": an edit that was found; "found": the content that a file had when the history first
  // saw it; "late": a change of the platform while the history could not be written
  std::string kind;
  std::string caller;      // the account or token, or the name of the program; empty if it is unknown
  std::string origin;      // the address of the caller, "unix", or "local" for a program; empty if it is unknown
  std::string method;      // "VORN.Core.FileServ.NFS/v1/set"; empty for a change that no call made
  std::string parameters;  // JSON without secrets; empty if there are none
  std::string undoes;      // of an undo: the id of the change that it takes back
  std::vector<std::string> files;
  std::vector<std::string> actions;  // operations on the service, with their outcome: "restart: done"
};

// A file that a change concerned.
struct HistoryFile {
  std::string path;
  std::string difference;  // in the unified format of diff(1); of a keytab: of the lines that klist(1) prints of it
};

// Conditions that all have to hold. An empty string or 0 is no condition.
struct HistoryFilter {
  std::string file;    // one of the files is this one
  std::string method;  // the method contains this string
  std::string caller;
  std::int64_t since = 0;  // not before this time, in seconds since the epoch
  std::int64_t until = 0;  // not after this time
};

enum : int {
  kHistoryFailed = -1,    // a failure other than the following ones
  kHistoryNoChange = -2,  // the history has no such change
  kHistoryConflict = -3,  // later changes touch the same lines; the reasons of the call (call.h) show them
  kHistoryFaulty = -4,    // a file would become faulty
  kHistoryFixed = -5,     // a change of this kind cannot be taken back
  kHistoryUndone = -6,    // the files are already as they were before the change
};

// Lists the changes that match, newest first, without the first `offset` of them and at most `limit`. `total` receives
// the number of those that match. A box without a history has no changes. Returns 0, or kHistoryFailed with the reason
// in the error facility (core.h). Takes no lock.
int ListHistory(const HistoryFilter& filter, int offset, int limit, std::vector<HistoryEntry>* entries, int* total);

// Reads a change with its files. Returns 0 or one of the values above.
int ShowHistory(const std::string& id, HistoryEntry* entry, std::vector<HistoryFile>* files);

// Takes a change back: merges its inverse into the files as they are now, by lines. `files` receives the paths of the
// files that this changed; the caller makes the service read them. Nothing is written unless all files can be merged
// and none gets a fault that it does not have. Needs the configuration lock (VornConf). Returns 0 or one of the values
// above.
int UndoChange(const std::string& id, std::vector<std::string>* files);

}  // namespace VORN

#endif  // VORN_PLATFORM_HISTORY_H

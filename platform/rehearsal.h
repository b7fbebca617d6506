// The rehearsal of a call: the call runs on a draft of the box, which reports what the call would have changed. Our own
// addition to the contract; a module never sees it.
#ifndef VORN_PLATFORM_REHEARSAL_H
#define VORN_PLATFORM_REHEARSAL_H

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "health.h"

namespace VORN {

// The changes that the calls on a draft would have made. All strings are valid UTF-8.
struct Rehearsal {
  // A file with another content.
  struct File {
    std::string path;        // on the box: "/etc/exports"
    std::string difference;  // in the unified format of diff(1); of a keytab: what klist(1) prints, never a key
  };

  // An operation on the service, in the order of the operations.
  struct Action {
    std::string action;   // "start", "stop", "restart", "reload", ...
    std::string clients;  // what clients notice: "nothing", "reload", "restart", "start", "stop" or "disconnect"
    std::optional<int> grace_seconds;  // of a restart: how long no new file is opened and no new lock is granted
    std::string effect;                // a sentence for an administrator
  };

  // A client of an exported directory whose rights change.
  struct Rule {
    struct Change {
      std::string change;  // "read_only", "flavor_removed", ...
      std::string access;  // "less", "more" or "other"
      std::string flavor;  // "sys", "krb5", ...; empty if it concerns all flavours
      std::string text;    // a phrase for an administrator: "becomes read-only"
    };
    std::string directory;
    std::string client;  // as in the exports file
    std::vector<Change> changes;
  };

  // A client that uses an export in which its rights change (clients.h).
  struct Client {
    std::string address;
    std::string name;
    std::string version;
    std::string path;                   // of the export
    std::vector<Rule::Change> changes;  // never empty
    bool is_certain = true;             // false: rules for the names of hosts, which are not asked for, may decide
  };

  // The findings of a check (health.h) that the change would add or remove. Those that depend on the running service
  // are not foreseen.
  struct Findings {
    std::vector<HealthFinding> added;
    std::vector<HealthFinding> removed;
  };

  std::vector<File> files;
  std::vector<Action> actions;
  std::vector<Rule> rules;
  std::vector<Client> clients;
  bool has_all_clients = true;  // false: there were too many to compare, or they cannot be listed
};

// A draft of this process's box. Its files are those of the box, each as it is at its first read, and its service is in
// the state in which the service is when it is first asked for. What is written to the draft stays in memory, and an
// operation on its service is only recorded.
//
// A call whose description (call.h) has a draft works on it instead of the box: it takes no lock, writes no file, runs
// no program and drives no service, and may do so even in a call of a caller that may only read. Several calls may use
// one draft, one after the other; each sees the changes of those before it.
class Draft {
 public:
  Draft();
  ~Draft();
  Draft(const Draft&) = delete;
  Draft& operator=(const Draft&) = delete;

  // Returns what the calls on the draft would have done so far. A difference has `context` unchanged lines around each
  // change.
  Rehearsal Report(int context = 3) const;

  // Makes the check on the draft and on the box, and compares the findings; none if no file was changed. They may
  // concern any shared folder.
  Rehearsal::Findings CompareFindings() const;

  struct State;  // the platform's own
  State& state() const;

 private:
  std::unique_ptr<State> state_;
};

}  // namespace VORN

#endif  // VORN_PLATFORM_REHEARSAL_H

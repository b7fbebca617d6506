// The faults of the file service, and what may surprise its clients. Our own addition to the contract: the API
// "VORN.Core.FileServ.NFS.Health" needs it. The answers have lists of sentences, so the operation is a C++ function
// with a value that belongs to the caller.
#ifndef VORN_PLATFORM_HEALTH_H
#define VORN_PLATFORM_HEALTH_H

#include <map>
#include <string>
#include <variant>
#include <vector>

namespace VORN {

// A call of the web API that carries out a remedy.
struct HealthCall {
  using Parameter = std::variant<bool, std::string, std::vector<std::string>>;

  std::string api;  // empty: no call can do it
  int version = 0;
  std::string method;
  std::map<std::string, Parameter> parameters;
};

// The object of a finding. An empty string or 0 stands for nothing.
struct HealthSubject {
  std::string share;    // the name of a shared folder
  std::string client;   // as it is written in an export rule
  std::string file;     // a path of the box
  int line = 0;         // of the file, from 1
  std::string setting;  // "nfsd vers4": the section and the key of a configuration file
  std::string mapping;  // the Kerberos principal of an ID mapping
};

struct HealthFinding {
  enum class Severity {
    kError,    // clients do not get what was configured, or the next start will take it from them
    kWarning,  // clients get more or less than somebody may have meant
    kNotice    // worth knowing; nothing has to be done
  };
  std::string kind;  // stable: "exports_fault", "left_share", ...
  Severity severity = Severity::kNotice;
  HealthSubject subject;
  std::string text;    // a sentence: what it means for clients
  std::string remedy;  // a sentence
  HealthCall call;
};

// A check that could not be made, or not completely.
struct HealthGap {
  std::string kind;
  std::string reason;  // a sentence
};

// All strings are valid UTF-8.
struct HealthReport {
  std::vector<HealthFinding> findings;  // by severity, then by kind
  std::vector<HealthGap> not_checked;
};

// Checks the box. Changes nothing, takes no lock and asks no name server: of host names it knows what the platform, the
// kernel and /etc/hosts remember. What it cannot check is in the report. In a rehearsal it checks the draft (call.h).
// Thread-safe.
HealthReport CheckHealth();

// Returns the name of each kind of finding, in the order of the report.
std::vector<std::string> HealthKinds();

}  // namespace VORN

#endif  // VORN_PLATFORM_HEALTH_H

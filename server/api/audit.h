// One entry in the log for each call that may have changed something.
#ifndef VORN_SERVER_AUDIT_H
#define VORN_SERVER_AUDIT_H

#include <json/value.h>

#include <chrono>
#include <functional>
#include <string>

namespace vorn::server {

struct AuditRecord {
  std::string caller;  // the authenticated account or token; empty if it is unknown
  std::string origin;  // the peer's address, or "unix"
  std::string method;  // "VORN.Core.FileServ.NFS/v1/set"
  std::string parameters;
  int status = 0;  // of HTTP: 200 for success
  int code = 0;    // the error code of the answer; 0 for success
  std::chrono::microseconds duration{0};
};

// Writes a record. It is called on the thread of the call, before the answer, so that no acknowledged change is missing
// in the log. Thread-safe.
using AuditSink = std::function<void(const AuditRecord&)>;

// The longest text of parameters in a record, in bytes. A longer one is cut, and "..." marks the place.
constexpr std::size_t kMostAuditedBytes = 16384;

// The parameters as compact JSON in ASCII, on one line.
std::string AuditedParameters(const Json::Value& parameters);

// A record as one line that begins with `kind`.
std::string FormatAudit(const AuditRecord& record, const char* kind = "audit");

// Writes to the systemd journal, in fields of their own (VORN_CALL, VORN_PARAMETERS, ...; systemd.journal-fields(7)).
AuditSink JournalAudit();

// Writes lines to syslog(3).
AuditSink SyslogAudit();

}  // namespace vorn::server

#endif  // VORN_SERVER_AUDIT_H

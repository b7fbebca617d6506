#include "audit.h"

#include <syslog.h>
#include <systemd/sd-journal.h>

#include "answer.h"

namespace vorn::server {
namespace {

// Marks the entries in the journal: "journalctl MESSAGE_ID=...".
constexpr char kMessageId[] = "MESSAGE_ID=5b2cf0b1b7f84c1f9a6f0f3b86a5d7c4";

std::string OutcomeOf(const AuditRecord& record) {
  return record.code == 0 ? "succeeded" : "failed with " + std::to_string(record.code);
}

void WriteToJournal(const AuditRecord& record) {
  sd_journal_send(kMessageId, "MESSAGE=%s", FormatAudit(record).c_str(), "PRIORITY=%d", LOG_NOTICE,
                  "SYSLOG_IDENTIFIER=vornd", "VORN_CALLER=%s", record.caller.c_str(), "VORN_PEER=%s",
                  record.origin.c_str(), "VORN_CALL=%s", record.method.c_str(), "VORN_PARAMETERS=%s",
                  record.parameters.c_str(), "VORN_STATUS=%d", record.status, "VORN_CODE=%d", record.code,
                  "VORN_WORKED_US=%lld", static_cast<long long>(record.duration.count()), nullptr);
}

}  // namespace

std::string AuditedParameters(const Json::Value& parameters) {
  std::string text = WriteJson(parameters);
  if (text.size() > kMostAuditedBytes) text.replace(kMostAuditedBytes, std::string::npos, "...");
  return text;
}

std::string FormatAudit(const AuditRecord& record, const char* kind) {
  return std::string(kind) + ": " + (record.caller.empty() ? "-" : record.caller) + " " + record.origin + " " +
         record.method + " " + record.parameters + " " + OutcomeOf(record) + ", " +
         std::to_string(record.duration.count()) + " us";
}

AuditSink JournalAudit() { return WriteToJournal; }

AuditSink SyslogAudit() {
  return [](const AuditRecord& record) { syslog(LOG_NOTICE, "%s", FormatAudit(record).c_str()); };
}

}  // namespace vorn::server

#include "ticket_log.h"

#include <algorithm>
#include <chrono>

#include "journal.h"

namespace vorn {
namespace {

constexpr char kIdentifier[] = "rpc.svcgssd";
constexpr std::chrono::hours kAge{1};
constexpr std::size_t kLongestReason = 200;
constexpr std::string_view kBegin = "ERROR: GSS-API: error in handle_nullreq: gss_accept_sec_context(): ";

}  // namespace

// "GSS_S_FAILURE (Unspecified GSS failure.  Minor code may provide more information) - REASON".
std::optional<std::string> ParseTicketMessage(std::string_view message) {
  constexpr std::string_view kSeparator = ") - ";
  if (message.substr(0, kBegin.size()) != kBegin) return std::nullopt;
  message.remove_prefix(kBegin.size());
  const std::size_t end = message.find(kSeparator);
  if (end == std::string_view::npos) return std::nullopt;
  std::string reason(message.substr(end + kSeparator.size(), kLongestReason));
  while (!reason.empty() && (reason.back() == '\n' || reason.back() == '.')) reason.pop_back();
  return reason.empty() ? std::nullopt : std::optional(std::move(reason));
}

void TicketLog::Add(std::string_view message, std::int64_t time) {
  const std::optional<std::string> reason = ParseTicketMessage(message);
  if (!reason || (refused_.size() == kMostTicketReasons && refused_.count(*reason) == 0)) return;
  Refused& refused = refused_[*reason];
  ++refused.count;
  refused.last = std::max(refused.last, time);
}

TicketLog ReadTicketLog() {
  TicketLog log;
  VisitJournal(kIdentifier, kAge, [&](std::string_view message, std::int64_t time) { log.Add(message, time); });
  return log;
}

}  // namespace vorn

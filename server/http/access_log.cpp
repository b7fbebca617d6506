#include "access_log.h"

#include <syslog.h>
#include <systemd/sd-journal.h>

#include <cinttypes>
#include <cstdio>
#include <string_view>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::chrono::seconds kSummaryInterval{10};
constexpr std::size_t kMaxTargetBytes = 1024;

std::string Escaped(std::string_view text) {
  std::string escaped;
  for (const char c : text.substr(0, kMaxTargetBytes)) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte >= 0x20 && byte < 0x7f && c != '"' && c != '\\') {
      escaped += c;
      continue;
    }
    char code[8];
    std::snprintf(code, sizeof code, "\\x%02x", byte);
    escaped += code;
  }
  return text.size() > kMaxTargetBytes ? escaped + "..." : escaped;
}

std::string FormatCounts(const AccessLog::Counts& counts) {
  return std::to_string(counts.busy) + " requests were answered 503, " + std::to_string(counts.dropped) +
         " more have no line in the access log";
}

std::string Credential(const Peer& peer, bool of_process) {
  if (!peer.credentials) return "";
  return std::to_string(of_process ? static_cast<std::int64_t>(peer.credentials->pid)
                                   : static_cast<std::int64_t>(peer.credentials->uid));
}

void WriteToJournal(const AccessRecord& record) {
  sd_journal_send("MESSAGE=%s", FormatRecord(record).c_str(), "PRIORITY=%d", LOG_INFO, "SYSLOG_IDENTIFIER=vornd",
                  "VORN_CALLER=%s", record.caller.c_str(), "VORN_PEER=%s", record.peer.address.c_str(),
                  "VORN_PEER_UID=%s", Credential(record.peer, false).c_str(), "VORN_PEER_PID=%s",
                  Credential(record.peer, true).c_str(), "VORN_METHOD=%s", Escaped(record.method).c_str(),
                  "VORN_TARGET=%s", Escaped(record.target).c_str(), "VORN_STATUS=%d", record.status,
                  "VORN_BYTES=%" PRIu64, record.bytes, "VORN_QUEUED_US=%lld",
                  static_cast<long long>(record.queued.count()), "VORN_WORKED_US=%lld",
                  static_cast<long long>(record.worked.count()), nullptr);
}

}  // namespace

AccessLog::AccessLog(Sink sink, std::size_t queue) : sink_(std::move(sink)), limit_(queue) {
  thread_ = std::thread([this] { Work(); });
}

AccessLog::~AccessLog() {
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    stopping_ = true;
  }
  wake_.notify_one();
  thread_.join();
}

void AccessLog::Add(AccessRecord record) noexcept {
  const std::lock_guard<std::mutex> lock(mutex_);
  if (record.status == 503) {
    ++counts_.busy;
    return;
  }
  try {
    if (queue_.size() < limit_) {
      queue_.push_back(std::move(record));
      if (queue_.size() == 1) wake_.notify_one();
      return;
    }
  } catch (const std::bad_alloc&) {
    // The record is counted below.
  }
  ++counts_.dropped;
}

void AccessLog::Drop() noexcept {
  const std::lock_guard<std::mutex> lock(mutex_);
  ++counts_.dropped;
}

void AccessLog::Write(const std::vector<AccessRecord>& records) noexcept {
  for (const AccessRecord& record : records) {
    try {
      sink_.write(record);
    } catch (const std::exception&) {
      Drop();
    }
  }
}

// If there is no memory for a summary, its counts become part of the next one.
void AccessLog::Work() {
  std::unique_lock<std::mutex> lock(mutex_);
  auto next_summary = std::chrono::steady_clock::now() + kSummaryInterval;
  while (!stopping_ || !queue_.empty()) {
    if (queue_.empty()) wake_.wait_until(lock, next_summary, [this] { return stopping_ || !queue_.empty(); });
    if (std::chrono::steady_clock::now() >= next_summary) {
      WriteCounts(&lock);
      next_summary = std::chrono::steady_clock::now() + kSummaryInterval;
    }
    const std::vector<AccessRecord> records = std::exchange(queue_, {});
    lock.unlock();
    Write(records);
    lock.lock();
  }
  WriteCounts(&lock);
}

void AccessLog::WriteCounts(std::unique_lock<std::mutex>* lock) {
  const Counts counts = std::exchange(counts_, {});
  if (counts.busy == 0 && counts.dropped == 0) return;
  lock->unlock();
  bool written = true;
  try {
    sink_.summarize(counts);
  } catch (const std::exception&) {
    written = false;
  }
  lock->lock();
  if (written) return;
  counts_.busy += counts.busy;
  counts_.dropped += counts.dropped;
}

std::string FormatRecord(const AccessRecord& record) {
  std::string line = record.caller.empty() ? "-" : Escaped(record.caller);
  line += " " + record.peer.address;
  if (record.peer.credentials) line += " uid=" + Credential(record.peer, false);
  line += " \"" + Escaped(record.method) + " " + Escaped(record.target) + "\" " + std::to_string(record.status);
  line += " " + std::to_string(record.bytes) + " bytes, queued " + std::to_string(record.queued.count());
  return line + " us, worked " + std::to_string(record.worked.count()) + " us";
}

AccessLog::Sink JournalSink() {
  return {WriteToJournal, [](const AccessLog::Counts& counts) {
            sd_journal_send("MESSAGE=%s", FormatCounts(counts).c_str(), "PRIORITY=%d", LOG_WARNING,
                            "SYSLOG_IDENTIFIER=vornd", "VORN_BUSY=%" PRIu64, counts.busy, nullptr);
          }};
}

AccessLog::Sink SyslogSink() {
  return {[](const AccessRecord& record) { syslog(LOG_INFO, "%s", FormatRecord(record).c_str()); },
          [](const AccessLog::Counts& counts) { syslog(LOG_WARNING, "%s", FormatCounts(counts).c_str()); }};
}

}  // namespace vorn::server

#include "access_log.h"

#include <sys/uio.h>
#include <syslog.h>
#include <unistd.h>

// The place in this source, which systemd would add to each entry, says nothing about a request.
#define SD_JOURNAL_SUPPRESS_LOCATION
#include <systemd/sd-journal.h>

#include <algorithm>
#include <cerrno>
#include <cinttypes>
#include <climits>
#include <cstdio>
#include <memory>
#include <string_view>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::chrono::seconds kSummaryInterval{10};
constexpr std::chrono::milliseconds kCollectingTime{100};
constexpr std::size_t kMaxTargetBytes = 1024;
constexpr std::size_t kMaxOtherBytes = 128;  // of a line, besides its texts: five numbers and the words around them
constexpr std::string_view kIdentifier = "vornd";

bool IsPlain(char c) {
  const auto byte = static_cast<unsigned char>(c);
  return byte >= 0x20 && byte < 0x7f && c != '"' && c != '\\';
}

std::string Escaped(std::string_view text) {
  if (text.size() <= kMaxTargetBytes && std::all_of(text.begin(), text.end(), IsPlain)) return std::string(text);
  std::string escaped;
  for (const char c : text.substr(0, kMaxTargetBytes)) {
    if (IsPlain(c)) {
      escaped += c;
      continue;
    }
    char code[8];
    std::snprintf(code, sizeof code, "\\x%02x", static_cast<unsigned char>(c));
    escaped += code;
  }
  return text.size() > kMaxTargetBytes ? escaped + "..." : escaped;
}

std::string FormatCounts(const AccessLog::Counts& counts) {
  return std::to_string(counts.busy) + " requests were answered 503, " + std::to_string(counts.dropped) +
         " more have no line in the access log";
}

// A journal entry, whose fields are built in one buffer. Reused for all entries.
class JournalEntry {
 public:
  void Add(std::string_view name, std::string_view value) {
    text_.append(name).append("=").append(value);
    ends_.push_back(text_.size());
  }
  void Add(std::string_view name, std::uint64_t value) { Add(name, std::to_string(value)); }

  void Send() {
    fields_.clear();
    std::size_t begin = 0;
    for (const std::size_t end : ends_) {
      fields_.push_back({text_.data() + begin, end - begin});
      begin = end;
    }
    sd_journal_sendv(fields_.data(), static_cast<int>(fields_.size()));
  }

  void Clear() {
    text_.clear();
    ends_.clear();
  }

 private:
  std::string text_;
  std::vector<std::size_t> ends_;  // of the fields in the buffer
  std::vector<iovec> fields_;
};

void Write(const AccessRecord& record, JournalEntry* entry) {
  entry->Clear();
  entry->Add("MESSAGE", FormatRecord(record));
  entry->Add("PRIORITY", std::uint64_t{LOG_INFO});
  entry->Add("SYSLOG_IDENTIFIER", kIdentifier);
  entry->Add("VORN_CALLER", record.caller);
  entry->Add("VORN_PEER", record.peer.address);
  if (const auto& credentials = record.peer.credentials) {
    entry->Add("VORN_PEER_UID", credentials->uid);
    entry->Add("VORN_PEER_PID", static_cast<std::uint64_t>(credentials->pid));
  }
  entry->Add("VORN_METHOD", Escaped(record.method));
  entry->Add("VORN_TARGET", Escaped(record.target));
  entry->Add("VORN_STATUS", static_cast<std::uint64_t>(record.status));
  entry->Add("VORN_BYTES", record.bytes);
  entry->Add("VORN_QUEUED_US", static_cast<std::uint64_t>(record.queued.count()));
  entry->Add("VORN_WORKED_US", static_cast<std::uint64_t>(record.worked.count()));
  entry->Send();
}

// Collects lines, and writes so many of them at a time as a pipe takes in one piece (PIPE_BUF, pipe(7)): lines of other
// writers never get into them.
class LineBuffer {
 public:
  explicit LineBuffer(int descriptor)
      : descriptor_(descriptor), prefix_(std::string(kIdentifier) + "[" + std::to_string(getpid()) + "]: ") {}

  void Add(std::string_view line) {
    if (text_.size() + prefix_.size() + line.size() >= PIPE_BUF) Flush();
    text_.append(prefix_).append(line).append("\n");
  }

  void Flush() noexcept {
    std::string_view rest = text_;
    while (!rest.empty()) {
      const ssize_t count = write(descriptor_, rest.data(), rest.size());
      if (count < 0 && errno != EINTR) break;
      if (count > 0) rest.remove_prefix(static_cast<std::size_t>(count));
    }
    text_.clear();
  }

 private:
  const int descriptor_;
  const std::string prefix_;
  std::string text_;
};

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
  try {
    ++statuses_[record.status];
    if (record.status == 503) {
      ++counts_.busy;
      return;
    }
    if (queue_.size() < limit_) {
      queue_.push_back(std::move(record));
      if (queue_.size() == 1 || queue_.size() == limit_ / 2) wake_.notify_one();
      return;
    }
  } catch (const std::bad_alloc&) {
    // The record is counted below.
  }
  ++counts_.dropped;
}

std::map<int, std::uint64_t> AccessLog::Statuses() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return statuses_;
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
  sink_.flush();
}

// If there is no memory for a summary, its counts become part of the next one.
void AccessLog::Work() {
  std::unique_lock<std::mutex> lock(mutex_);
  auto next_summary = std::chrono::steady_clock::now() + kSummaryInterval;
  std::vector<AccessRecord> records;
  while (!stopping_ || !queue_.empty()) {
    wake_.wait_until(lock, next_summary, [this] { return stopping_ || !queue_.empty(); });
    wake_.wait_for(lock, kCollectingTime, [this] { return stopping_ || queue_.size() >= limit_ / 2; });
    if (std::chrono::steady_clock::now() >= next_summary) {
      WriteCounts(&lock);
      next_summary = std::chrono::steady_clock::now() + kSummaryInterval;
    }
    records.swap(queue_);
    lock.unlock();
    Write(records);
    records.clear();
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
  const std::string caller = record.caller.empty() ? "-" : Escaped(record.caller);
  const std::string method = Escaped(record.method);
  const std::string target = Escaped(record.target);
  std::string line;
  line.reserve(caller.size() + record.peer.address.size() + method.size() + target.size() + kMaxOtherBytes);
  line.append(caller).append(" ").append(record.peer.address);
  if (record.peer.credentials) line.append(" uid=").append(std::to_string(record.peer.credentials->uid));
  line.append(" \"").append(method).append(" ").append(target).append("\" ").append(std::to_string(record.status));
  line.append(" ").append(std::to_string(record.bytes)).append(" bytes, queued ");
  line.append(std::to_string(record.queued.count())).append(" us, worked ");
  return line.append(std::to_string(record.worked.count())).append(" us");
}

AccessLog::Sink JournalSink() {
  return {[entry = std::make_shared<JournalEntry>()](const AccessRecord& record) { Write(record, entry.get()); }, [] {},
          [](const AccessLog::Counts& counts) {
            sd_journal_send("MESSAGE=%s", FormatCounts(counts).c_str(), "PRIORITY=%d", LOG_WARNING,
                            "SYSLOG_IDENTIFIER=vornd", "VORN_BUSY=%" PRIu64, counts.busy, nullptr);
          }};
}

AccessLog::Sink LineSink(int descriptor) {
  const auto lines = std::make_shared<LineBuffer>(descriptor);
  return {[lines](const AccessRecord& record) { lines->Add(FormatRecord(record)); }, [lines] { lines->Flush(); },
          [](const AccessLog::Counts& counts) { syslog(LOG_WARNING, "%s", FormatCounts(counts).c_str()); }};
}

}  // namespace vorn::server

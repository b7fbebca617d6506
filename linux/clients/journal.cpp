#include <systemd/sd-journal.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string_view>

#include "mount_log.h"

namespace vorn {
namespace {

using Journal = std::unique_ptr<sd_journal, decltype(&sd_journal_close)>;

constexpr char kMountd[] = "SYSLOG_IDENTIFIER=rpc.mountd";
constexpr std::string_view kMessage = "MESSAGE=";
constexpr std::chrono::hours kAge{24};
constexpr int kMostMessages = 10000;

std::uint64_t Now() {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return static_cast<std::uint64_t>(std::chrono::duration_cast<std::chrono::microseconds>(now).count());
}

Journal Open() {
  sd_journal* journal = nullptr;
  if (sd_journal_open(&journal, SD_JOURNAL_LOCAL_ONLY | SD_JOURNAL_SYSTEM) < 0) journal = nullptr;
  return {journal, sd_journal_close};
}

void AddMessage(sd_journal* journal, std::uint64_t time, MountLog* log) {
  const void* data = nullptr;
  std::size_t size = 0;
  if (sd_journal_get_data(journal, "MESSAGE", &data, &size) < 0 || size < kMessage.size()) return;
  const std::string_view field(static_cast<const char*>(data), size);
  constexpr std::uint64_t kSecond = 1'000'000;
  const std::optional<MountRequest> request = ParseMountMessage(field.substr(kMessage.size()));
  if (request) log->Add(*request, static_cast<std::int64_t>(time / kSecond));
}

}  // namespace

MountLog ReadMountLog() {
  MountLog log;
  const Journal journal = Open();
  if (!journal || sd_journal_add_match(journal.get(), kMountd, 0) < 0 || sd_journal_seek_tail(journal.get()) < 0) {
    return log;
  }
  const std::uint64_t oldest = Now() - static_cast<std::uint64_t>(std::chrono::microseconds(kAge).count());
  for (int messages = 0; messages < kMostMessages && sd_journal_previous(journal.get()) > 0; ++messages) {
    std::uint64_t time = 0;
    if (sd_journal_get_realtime_usec(journal.get(), &time) < 0 || time < oldest) break;
    AddMessage(journal.get(), time, &log);
  }
  return log;
}

}  // namespace vorn

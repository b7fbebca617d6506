#include "journal.h"

#include <systemd/sd-journal.h>

#include <memory>

namespace vorn {
namespace {

using Journal = std::unique_ptr<sd_journal, decltype(&sd_journal_close)>;

constexpr std::string_view kMessage = "MESSAGE=";
constexpr int kMostMessages = 10000;
constexpr std::uint64_t kSecond = 1'000'000;  // the journal's times are in microseconds

std::uint64_t Now() {
  const auto now = std::chrono::system_clock::now().time_since_epoch();
  return static_cast<std::uint64_t>(std::chrono::duration_cast<std::chrono::microseconds>(now).count());
}

Journal Open() {
  sd_journal* journal = nullptr;
  if (sd_journal_open(&journal, SD_JOURNAL_LOCAL_ONLY | SD_JOURNAL_SYSTEM) < 0) journal = nullptr;
  return {journal, sd_journal_close};
}

}  // namespace

void VisitJournal(const std::string& identifier, std::chrono::seconds age,
                  const std::function<void(std::string_view message, std::int64_t time)>& visit) {
  const Journal journal = Open();
  const std::string match = "SYSLOG_IDENTIFIER=" + identifier;
  if (!journal || sd_journal_add_match(journal.get(), match.c_str(), 0) < 0) return;
  if (sd_journal_seek_tail(journal.get()) < 0) return;
  const std::uint64_t oldest = Now() - static_cast<std::uint64_t>(std::chrono::microseconds(age).count());
  for (int messages = 0; messages < kMostMessages && sd_journal_previous(journal.get()) > 0; ++messages) {
    std::uint64_t time = 0;
    if (sd_journal_get_realtime_usec(journal.get(), &time) < 0 || time < oldest) return;
    const void* data = nullptr;
    std::size_t size = 0;
    if (sd_journal_get_data(journal.get(), "MESSAGE", &data, &size) < 0 || size < kMessage.size()) continue;
    const std::string_view field(static_cast<const char*>(data), size);
    visit(field.substr(kMessage.size()), static_cast<std::int64_t>(time / kSecond));
  }
}

}  // namespace vorn

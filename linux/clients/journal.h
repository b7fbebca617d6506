// The messages of a daemon in the journal of this system.
#ifndef VORN_LINUX_CLIENTS_JOURNAL_H
#define VORN_LINUX_CLIENTS_JOURNAL_H

#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <string_view>

namespace vorn {

// Calls `visit` with the messages of the last `age`, at most the newest 10,000, and their times in seconds since the
// epoch; the newest ones come first. `identifier` is that of syslog(3). Visits nothing if there is no journal.
void VisitJournal(const std::string& identifier, std::chrono::seconds age,
                  const std::function<void(std::string_view message, std::int64_t time)>& visit);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_JOURNAL_H

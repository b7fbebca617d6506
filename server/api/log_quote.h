// Untrusted text in log lines.
#ifndef VORN_SERVER_LOG_QUOTE_H
#define VORN_SERVER_LOG_QUOTE_H

#include <cstddef>
#include <string>
#include <string_view>

namespace vorn::server {

constexpr std::size_t kMostQuotedBytes = 1024;

// The text with control characters replaced by '?', so that it stays on one line, and cut to at most
// kMostQuotedBytes, with "..." at the end if something is missing.
std::string QuotedForLog(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_LOG_QUOTE_H

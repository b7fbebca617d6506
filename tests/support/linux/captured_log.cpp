#include "captured_log.h"

#include <cstdarg>
#include <cstdio>
#include <mutex>
#include <utility>

namespace {

std::mutex mutex;
std::vector<LogLine> lines;

__attribute__((format(printf, 2, 0))) void Keep(int priority, const char* format, va_list arguments) {
  char text[4096];
  // NOLINTNEXTLINE(clang-analyzer-valist.Uninitialized): the callers started it
  std::vsnprintf(text, sizeof text, format, arguments);
  const std::lock_guard<std::mutex> guard(mutex);
  lines.push_back({priority, text});
}

}  // namespace

std::vector<LogLine> TakeLog() {
  const std::lock_guard<std::mutex> guard(mutex);
  return std::exchange(lines, {});
}

std::string LastText(const std::vector<LogLine>& log) { return log.empty() ? "(nothing was logged)" : log.back().text; }

// These functions replace syslog(3) of the C library. A fortified build calls the second one.
extern "C" {

__attribute__((format(printf, 2, 3))) void syslog(int priority, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Keep(priority, format, arguments);
  va_end(arguments);
}

// NOLINTNEXTLINE(bugprone-reserved-identifier): the C library's name
__attribute__((format(printf, 3, 4))) void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  Keep(priority, format, arguments);
  va_end(arguments);
}

}  // extern "C"

// The log of this test program: replaces syslog(3) and captures the messages.
#ifndef VORN_TESTS_SUPPORT_LINUX_CAPTURED_LOG_H
#define VORN_TESTS_SUPPORT_LINUX_CAPTURED_LOG_H

#include <string>
#include <vector>

struct LogLine {
  int priority;  // LOG_ERR, ...
  std::string text;
};

// Returns the messages that all threads logged since the last call.
std::vector<LogLine> TakeLog();

// Returns the text of the last of these messages, or "(nothing was logged)".
std::string LastText(const std::vector<LogLine>& log);

#endif  // VORN_TESTS_SUPPORT_LINUX_CAPTURED_LOG_H

// The types of settings, and their syntax in vornd.conf(5) and on the command line.
#ifndef VORN_SERVER_SETTING_VALUES_H
#define VORN_SERVER_SETTING_VALUES_H

#include <chrono>
#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vorn::server {

// Why a value is refused.
struct ValueFault {
  std::size_t offset;  // of the faulty part, in bytes from the beginning of the value
  std::string text;
};

struct ListenAddresses {
  std::vector<std::string> each;  // as OpenListener() takes them
};
struct HostNames {
  std::vector<std::string> each;  // without a port; an IPv6 address is in brackets
};
struct FilePath {
  std::string path;  // absolute; empty if there is none
};
struct GroupName {
  std::string name;
};
struct Count {
  std::size_t number = 0;  // from 1 to 65536
};
struct ByteCount {
  std::size_t bytes = 0;  // from 64 KiB to 1 GiB; written with a unit: "12MiB"
};
struct Duration {
  std::chrono::seconds time{0};  // from 1 s to 366 days, written with a unit: "30min"; 0: "none"
};
struct LogLevel {
  int priority = 0;  // as of syslog(3)
};

// Each function parses `text`, which has no blanks around it, into `value`, which has its default. On failure the value
// is not changed. A time may be "none" if that is its default.
std::optional<ValueFault> ParseValue(std::string_view text, ListenAddresses* value);
std::optional<ValueFault> ParseValue(std::string_view text, HostNames* value);
std::optional<ValueFault> ParseValue(std::string_view text, FilePath* value);
std::optional<ValueFault> ParseValue(std::string_view text, GroupName* value);
std::optional<ValueFault> ParseValue(std::string_view text, Count* value);
std::optional<ValueFault> ParseValue(std::string_view text, ByteCount* value);
std::optional<ValueFault> ParseValue(std::string_view text, Duration* value);
std::optional<ValueFault> ParseValue(std::string_view text, LogLevel* value);
std::optional<ValueFault> ParseValue(std::string_view text, bool* value);

// Each function returns a string that ParseValue() turns into the same value.
std::string FormatValue(const ListenAddresses& value);
std::string FormatValue(const HostNames& value);
std::string FormatValue(const FilePath& value);
std::string FormatValue(const GroupName& value);
std::string FormatValue(const Count& value);
std::string FormatValue(const ByteCount& value);
std::string FormatValue(const Duration& value);
std::string FormatValue(const LogLevel& value);
std::string FormatValue(const bool& value);

}  // namespace vorn::server

#endif  // VORN_SERVER_SETTING_VALUES_H

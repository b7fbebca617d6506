#include "setting_values.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <syslog.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <utility>

#include "listener.h"

namespace vorn::server {
namespace {

constexpr std::string_view kBlanks = " \t";
constexpr std::uint64_t kSmallestSize = std::uint64_t{64} << 10;
constexpr std::uint64_t kLargestSize = std::uint64_t{1} << 30;
constexpr std::uint64_t kLongestDuration = std::uint64_t{366} * 24 * 60 * 60;
constexpr std::uint64_t kLargestCount = 65536;

struct Unit {
  std::string_view name;
  std::uint64_t amount;
};
// From the largest to the smallest one.
constexpr std::array<Unit, 4> kTimes = {{{"d", 86400}, {"h", 3600}, {"min", 60}, {"s", 1}}};
constexpr std::array<Unit, 3> kSizes = {
    {{"GiB", std::uint64_t{1} << 30}, {"MiB", std::uint64_t{1} << 20}, {"KiB", std::uint64_t{1} << 10}}};

constexpr std::array<std::pair<std::string_view, int>, 5> kLevels = {
    {{"error", LOG_ERR}, {"warning", LOG_WARNING}, {"notice", LOG_NOTICE}, {"info", LOG_INFO}, {"debug", LOG_DEBUG}}};

struct Word {
  std::size_t offset;
  std::string text;
};

std::vector<Word> SplitWords(std::string_view text) {
  std::vector<Word> words;
  std::size_t begin = 0;
  while ((begin = text.find_first_not_of(kBlanks, begin)) != std::string_view::npos) {
    const std::size_t end = std::min(text.find_first_of(kBlanks, begin), text.size());
    words.push_back({begin, std::string(text.substr(begin, end - begin))});
    begin = end;
  }
  return words;
}

std::string JoinWords(const std::vector<std::string>& words) {
  std::string text;
  for (const std::string& word : words) text.append(text.empty() ? "" : " ").append(word);
  return text;
}

std::string Quoted(std::string_view text) { return "\"" + std::string(text) + "\""; }

// Fills a list from words that `find_fault` accepts; none of them may be given twice.
template <typename FindFault>
std::optional<ValueFault> ParseList(std::string_view text, const FindFault& find_fault,
                                    std::vector<std::string>* list) {
  std::vector<std::string> each;
  for (Word& word : SplitWords(text)) {
    std::string fault = find_fault(word.text);
    if (fault.empty() && std::find(each.begin(), each.end(), word.text) != each.end()) fault = "given twice";
    if (!fault.empty()) return ValueFault{word.offset, Quoted(word.text) + ": " + fault};
    each.push_back(std::move(word.text));
  }
  *list = std::move(each);
  return std::nullopt;
}

bool IsAddress(const std::string& name) {
  in6_addr address{};
  if (inet_pton(AF_INET, name.c_str(), &address) == 1) return true;
  if (name.size() < 2 || name.front() != '[' || name.back() != ']') return false;
  return inet_pton(AF_INET6, name.substr(1, name.size() - 2).c_str(), &address) == 1;
}

bool IsLabelCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-';
}

// The labels of a host name (RFC 1123, 2.1).
bool IsHostName(std::string_view name) {
  if (name.empty() || name.size() > 253) return false;
  for (std::size_t begin = 0; begin <= name.size();) {
    const std::size_t end = std::min(name.find('.', begin), name.size());
    const std::string_view label = name.substr(begin, end - begin);
    const bool sound = !label.empty() && label.size() <= 63 && label.front() != '-' && label.back() != '-' &&
                       std::all_of(label.begin(), label.end(), IsLabelCharacter);
    if (!sound) return false;
    begin = end + 1;
  }
  return true;
}

// Parses a number with one of the units. `kind` is for the reason of a failure.
template <std::size_t kCount>
std::optional<ValueFault> ParseAmount(std::string_view text, const std::array<Unit, kCount>& units, const char* kind,
                                      std::uint64_t* amount) {
  std::uint64_t number = 0;
  const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), number);
  const std::size_t digits = static_cast<std::size_t>(end - text.data());
  if (failure != std::errc()) return ValueFault{0, Quoted(text) + " is no " + kind};
  const std::string_view name = text.substr(digits);
  const auto unit = std::find_if(units.begin(), units.end(), [name](const Unit& each) { return each.name == name; });
  if (unit == units.end()) return ValueFault{digits, Quoted(text) + " is no " + kind};
  if (number > UINT64_MAX / unit->amount) return ValueFault{0, Quoted(text) + " is too large"};
  *amount = number * unit->amount;
  return std::nullopt;
}

template <std::size_t kCount>
std::string FormatAmount(std::uint64_t amount, const std::array<Unit, kCount>& units) {
  const auto unit =
      std::find_if(units.begin(), units.end() - 1, [amount](const Unit& each) { return amount % each.amount == 0; });
  return std::to_string(amount / unit->amount) + std::string(unit->name);
}

}  // namespace

std::optional<ValueFault> ParseValue(std::string_view text, ListenAddresses* value) {
  return ParseList(text, FindAddressFault, &value->each);
}

std::optional<ValueFault> ParseValue(std::string_view text, HostNames* value) {
  const auto find_fault = [](const std::string& name) -> std::string {
    if (IsAddress(name) || IsHostName(name)) return "";
    return "no host name or address (without a port; an IPv6 address is in brackets)";
  };
  return ParseList(text, find_fault, &value->each);
}

std::optional<ValueFault> ParseValue(std::string_view text, FilePath* value) {
  if (!text.empty() && text.front() != '/') return ValueFault{0, Quoted(text) + " is no absolute path"};
  value->path = text;
  return std::nullopt;
}

// The rules of groupadd(8), as far as they concern the separators of group(5).
std::optional<ValueFault> ParseValue(std::string_view text, GroupName* value) {
  if (text.empty()) return ValueFault{0, "the name of a group is missing"};
  const std::size_t separator = text.find_first_of(" \t:,");
  if (separator != std::string_view::npos) return ValueFault{separator, Quoted(text) + " is no name of a group"};
  value->name = text;
  return std::nullopt;
}

std::optional<ValueFault> ParseValue(std::string_view text, Count* value) {
  std::uint64_t number = 0;
  const auto [end, failure] = std::from_chars(text.data(), text.data() + text.size(), number);
  if (failure != std::errc() || end != text.data() + text.size() || number == 0 || number > kLargestCount) {
    return ValueFault{0, Quoted(text) + " is no number from 1 to " + std::to_string(kLargestCount)};
  }
  value->number = number;
  return std::nullopt;
}

std::optional<ValueFault> ParseValue(std::string_view text, ByteCount* value) {
  std::uint64_t bytes = 0;
  if (auto fault = ParseAmount(text, kSizes, "size, a number with KiB, MiB or GiB", &bytes)) return fault;
  if (bytes < kSmallestSize || bytes > kLargestSize) {
    return ValueFault{0, Quoted(text) + " is not from 64KiB to 1GiB"};
  }
  value->bytes = bytes;
  return std::nullopt;
}

std::optional<ValueFault> ParseValue(std::string_view text, Duration* value) {
  const bool may_be_none = value->time.count() == 0;
  if (may_be_none && text == "none") return std::nullopt;
  std::uint64_t seconds = 0;
  if (auto fault = ParseAmount(text, kTimes, "time, a number with s, min, h or d", &seconds)) return fault;
  if (seconds == 0 || seconds > kLongestDuration) return ValueFault{0, Quoted(text) + " is not from 1s to 366d"};
  value->time = std::chrono::seconds(seconds);
  return std::nullopt;
}

std::optional<ValueFault> ParseValue(std::string_view text, LogLevel* value) {
  const auto level =
      std::find_if(kLevels.begin(), kLevels.end(), [text](const auto& each) { return each.first == text; });
  if (level == kLevels.end()) return ValueFault{0, Quoted(text) + " is not error, warning, notice, info or debug"};
  value->priority = level->second;
  return std::nullopt;
}

std::optional<ValueFault> ParseValue(std::string_view text, bool* value) {
  if (text != "yes" && text != "no") return ValueFault{0, Quoted(text) + " is neither yes nor no"};
  *value = text == "yes";
  return std::nullopt;
}

std::string FormatValue(const ListenAddresses& value) { return JoinWords(value.each); }
std::string FormatValue(const HostNames& value) { return JoinWords(value.each); }
std::string FormatValue(const FilePath& value) { return value.path; }
std::string FormatValue(const GroupName& value) { return value.name; }
std::string FormatValue(const Count& value) { return std::to_string(value.number); }
std::string FormatValue(const ByteCount& value) { return FormatAmount(value.bytes, kSizes); }

std::string FormatValue(const Duration& value) {
  if (value.time.count() == 0) return "none";
  return FormatAmount(static_cast<std::uint64_t>(value.time.count()), kTimes);
}

std::string FormatValue(const LogLevel& value) {
  const auto level = std::find_if(kLevels.begin(), kLevels.end(),
                                  [&value](const auto& each) { return each.second == value.priority; });
  return std::string(level == kLevels.end() ? "" : level->first);
}

std::string FormatValue(const bool& value) { return value ? "yes" : "no"; }

}  // namespace vorn::server

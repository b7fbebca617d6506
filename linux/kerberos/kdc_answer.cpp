#include "kdc_answer.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstddef>
#include <system_error>
#include <utility>

#include "lines.h"

namespace vorn {
namespace {

constexpr std::array<std::string_view, 4> kStates = {"current", "outdated", "unknown",
                                                     "none"};  // in the order of State
constexpr std::size_t kFields = 4;

// Principals and messages of the library may contain separators.
std::string WithoutSeparators(std::string text) {
  std::replace_if(
      text.begin(), text.end(), [](char c) { return c == '\t' || c == '\n'; }, ' ');
  return text;
}

std::optional<KdcAnswer> ParseAnswer(std::string_view line) {
  std::array<std::string_view, kFields> fields;
  for (std::size_t field = 0; field < kFields; ++field) {
    const std::size_t end = line.find('\t');
    if ((end == std::string_view::npos) != (field + 1 == kFields)) return std::nullopt;
    fields.at(field) = line.substr(0, end);
    line.remove_prefix(end == std::string_view::npos ? line.size() : end + 1);
  }
  const auto* const state = std::find(kStates.begin(), kStates.end(), fields[0]);
  if (state == kStates.end()) return std::nullopt;
  KdcAnswer answer{static_cast<KdcAnswer::State>(state - kStates.begin()), std::string(fields[1]),
                   std::string(fields[3]), std::nullopt};
  if (fields[2].empty()) return answer;
  long lead = 0;
  const char* const end = fields[2].data() + fields[2].size();
  const auto [last, error] = std::from_chars(fields[2].data(), end, lead);
  if (error != std::errc() || last != end) return std::nullopt;
  answer.clock_lead = lead;
  return answer;
}

}  // namespace

std::string FormatAnswers(const std::vector<KdcAnswer>& answers) {
  std::string text;
  for (const KdcAnswer& answer : answers) {
    text.append(kStates.at(static_cast<std::size_t>(answer.state))).append("\t");
    text.append(WithoutSeparators(answer.principal)).append("\t");
    if (answer.clock_lead) text.append(std::to_string(*answer.clock_lead));
    text.append("\t").append(WithoutSeparators(answer.detail)).append("\n");
  }
  return text;
}

Result<std::vector<KdcAnswer>> ParseAnswers(std::string_view text) {
  std::vector<KdcAnswer> answers;
  for (const std::string_view line : LinesOf(text)) {
    std::optional<KdcAnswer> answer = ParseAnswer(line);
    if (!answer) return Status::Failure(kSyntax, "unexpected answer: " + std::string(line));
    answers.push_back(std::move(*answer));
  }
  return answers;
}

}  // namespace vorn

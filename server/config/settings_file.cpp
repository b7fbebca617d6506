#include "settings_file.h"

#include <algorithm>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::string_view kBlanks = " \t";

bool IsControl(char c) { return (static_cast<unsigned char>(c) < 0x20 && c != '\t') || c == 0x7f; }

std::string Quoted(std::string_view text) { return "\"" + std::string(text) + "\""; }

// A part of a line and its offset in it.
struct Piece {
  std::size_t offset;
  std::string_view text;
};

Piece Trim(std::string_view line, std::size_t begin, std::size_t end) {
  while (begin < end && kBlanks.find(line[begin]) != std::string_view::npos) ++begin;
  while (end > begin && kBlanks.find(line[end - 1]) != std::string_view::npos) --end;
  return {begin, line.substr(begin, end - begin)};
}

bool IsSection(std::string_view name) {
  const auto& table = SettingsTable();
  return std::any_of(table.begin(), table.end(), [name](const Setting& each) { return each.section == name; });
}

// The section that has this key; empty if none or several have it.
std::string_view SectionOf(std::string_view key) {
  std::string_view section;
  for (const Setting& each : SettingsTable()) {
    if (each.key != key) continue;
    if (!section.empty()) return "";
    section = each.section;
  }
  return section;
}

class Parser {
 public:
  SettingsFile Run(std::string_view text) {
    while (!text.empty()) {
      const std::size_t end = std::min(text.find('\n'), text.size());
      ++line_;
      ReadLine(text.substr(0, end));
      text.remove_prefix(std::min(end + 1, text.size()));
    }
    return std::move(file_);
  }

 private:
  enum class Where { kNowhere, kSection, kUnknownSection };

  void Fail(std::size_t offset, std::string text) {
    file_.faults.push_back({{line_, static_cast<int>(offset) + 1}, std::move(text)});
  }

  void ReadLine(std::string_view line) {
    const auto control = std::find_if(line.begin(), line.end(), IsControl);
    if (control != line.end()) {
      return Fail(static_cast<std::size_t>(control - line.begin()), "a control character; lines end with a line feed");
    }
    const Piece content = Trim(line, 0, line.size());
    if (content.text.empty() || content.text.front() == '#' || content.text.front() == ';') return;
    content.text.front() == '[' ? ReadSection(content) : ReadAssignment(line, content);
  }

  void ReadSection(const Piece& content) {
    where_ = Where::kUnknownSection;
    if (content.text.back() != ']') return Fail(content.offset + content.text.size(), "\"]\" is missing");
    section_ = Trim(content.text, 1, content.text.size() - 1).text;
    if (!IsSection(section_)) return Fail(content.offset, "there is no section [" + section_ + "]");
    const auto [known, is_new] = sections_.emplace(section_, line_);
    if (!is_new) Fail(content.offset, "[" + section_ + "] began in line " + std::to_string(known->second));
    where_ = Where::kSection;
  }

  void ReadAssignment(std::string_view line, const Piece& content) {
    const std::size_t sign = line.find('=');
    if (sign == std::string_view::npos) return Fail(content.offset, "no comment, no [section] and no key = value");
    const Piece key = Trim(line, 0, sign);
    if (where_ == Where::kNowhere) return Fail(key.offset, "a key before the first [section]");
    if (where_ == Where::kUnknownSection) return;
    const Setting* setting = FindSetting(section_, key.text);
    if (setting == nullptr) return Fail(key.offset, UnknownKey(key.text));
    const auto [given, is_new] = given_.emplace(setting, line_);
    if (!is_new) {
      return Fail(key.offset, Quoted(key.text) + " is given in line " + std::to_string(given->second) + " already");
    }
    ReadValue(*setting, Trim(line, sign + 1, line.size()));
  }

  std::string UnknownKey(std::string_view key) const {
    std::string text = "there is no key " + Quoted(key) + " in [" + section_ + "]";
    if (const std::string_view section = SectionOf(key); !section.empty()) {
      text.append("; it belongs to [").append(section).append("]");
    }
    return text;
  }

  void ReadValue(const Setting& setting, const Piece& value) {
    for (std::size_t i = 1; i < value.text.size(); ++i) {
      const bool begins_comment = value.text[i] == '#' && kBlanks.find(value.text[i - 1]) != std::string_view::npos;
      if (begins_comment) return Fail(value.offset + i, "a comment has a line of its own");
    }
    file_.places[&setting] = {line_, static_cast<int>(value.offset) + 1};
    if (auto fault = setting.parse(value.text, &file_.settings)) {
      Fail(value.offset + fault->offset, std::string(setting.key) + ": " + fault->text);
    }
  }

  SettingsFile file_;
  int line_ = 0;
  Where where_ = Where::kNowhere;
  std::string section_;
  std::map<std::string, int, std::less<>> sections_;  // and the lines in which they begin
  std::map<const Setting*, int> given_;               // and the lines
};

}  // namespace

SettingsFile ParseSettings(std::string_view text) { return Parser().Run(text); }

}  // namespace vorn::server

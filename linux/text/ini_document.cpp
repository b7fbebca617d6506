#include "ini_document.h"

#include <algorithm>
#include <iterator>

namespace vorn {
namespace {

// Sections and keys meet in one index. A section without a name is none: "[]" is kept apart by the
// bracket.
std::string SectionId(std::string_view name) { return "[" + FoldIniName(name); }

std::string SectionId(const IniLine& line) {
  return SectionId(line.name) + (line.argument ? "\"" + FoldIniName(*line.argument) : "");
}

std::string KeyId(const std::string& section, std::string_view key) { return section + "\n" + FoldIniName(key); }

}  // namespace

std::optional<IniDocument> IniDocument::Parse(std::string_view text) {
  if (text.find('\0') != std::string_view::npos) return std::nullopt;
  IniDocument document;
  const std::size_t first_end = text.find('\n');
  if (first_end != std::string_view::npos && first_end > 0 && text[first_end - 1] == '\r') document.line_end_ = "\r\n";
  while (!text.empty()) {
    const std::size_t length = IniLineLength(text);
    document.Append(text.substr(0, length));
    text.remove_prefix(length);
  }
  return document;
}

void IniDocument::Append(std::string_view text) {
  lines_.push_back({std::string(text), {}, {}});
  if (IsEndedIniLine(text)) Register(std::prev(lines_.end()));
}

// Takes the document's new last line into the index.
void IniDocument::Register(Place line) {
  line->content = ReadIniLine(line->text);
  const IniLine& content = line->content;
  if (content.kind == IniLine::Kind::kNoSection) current_.clear();
  if (content.kind == IniLine::Kind::kSection) current_ = SectionId(content);
  if (content.kind != IniLine::Kind::kSection && content.kind != IniLine::Kind::kAssignment) return;
  if (current_.empty()) return;
  line->section = current_;
  last_of_[current_] = line;
  if (content.kind == IniLine::Kind::kAssignment) assignments_[KeyId(current_, content.name)].push_back(line);
}

void IniDocument::EndLastLine() {
  if (lines_.empty() || IsEndedIniLine(lines_.back().text)) return;
  Line& last = lines_.back();
  last.text += line_end_;
  if (!IsEndedIniLine(last.text)) last.text += line_end_;  // the first one was escaped
  Register(std::prev(lines_.end()));
}

std::string IniDocument::Text() const {
  std::string text;
  for (const Line& line : lines_) text += line.text;
  return text;
}

const IniDocument::Line* IniDocument::Find(std::string_view section, std::string_view key) const {
  const auto found = assignments_.find(KeyId(SectionId(section), key));
  if (found == assignments_.end()) return nullptr;
  const std::vector<Place>& places = found->second;
  const auto last =
      std::find_if(places.rbegin(), places.rend(), [](Place line) { return !line->content.value.empty(); });
  return last == places.rend() ? nullptr : &**last;
}

std::optional<std::string> IniDocument::Get(std::string_view section, std::string_view key) const {
  const Line* line = Find(section, key);
  if (line == nullptr) return std::nullopt;
  return line->content.value;
}

std::vector<IniEntry> IniDocument::Entries(std::string_view section) const {
  std::vector<IniEntry> entries;
  const std::string id = SectionId(section);
  for (const Line& line : lines_) {
    if (line.content.kind != IniLine::Kind::kAssignment || line.section != id) continue;
    if (Find(section, line.content.name) == &line) entries.push_back({line.content.name, line.content.value});
  }
  return entries;
}

int IniDocument::LineOf(std::string_view section, std::string_view key) const {
  const Line* wanted = Find(section, key);
  int number = 1;
  for (const Line& line : lines_) {
    if (&line == wanted) return number;
    number += static_cast<int>(std::count(line.text.begin(), line.text.end(), '\n'));
  }
  return 0;
}

void IniDocument::Set(const IniSection& section, const IniKey& key, const IniValue& value) {
  if (Get(section.text(), key.text()) == value.text()) return;
  EndLastLine();
  const auto found = assignments_.find(KeyId(SectionId(section.text()), key.text()));
  if (found == assignments_.end()) return Insert(section, key, value);
  std::vector<Place>& places = found->second;
  // The last line of all: whatever others say before it, it counts.
  Replace(places.back(), value);
}

void IniDocument::Replace(Place line, const IniValue& value) {
  const IniLine& old = line->content;
  const std::string head = line->text.substr(0, old.value_begin);
  std::string text = head + value.Rendered() + line->text.substr(old.value_end);
  // What stood after the old value's quotes may be no comment: then it goes.
  if (ReadIniLine(text).value != value.text()) text = old.name + " = " + value.Rendered() + line_end_;
  line->text = std::move(text);
  line->content = ReadIniLine(line->text);
}

void IniDocument::Insert(const IniSection& section, const IniKey& key, const IniValue& value) {
  const std::string id = SectionId(section.text());
  const auto known = last_of_.find(id);
  const Place after = known == last_of_.end() ? AddSection(section) : known->second;
  std::string text = key.text() + " = " + value.Rendered() + line_end_;
  IniLine content = ReadIniLine(text);
  const Place line = lines_.insert(std::next(after), {std::move(text), std::move(content), id});
  last_of_[id] = line;
  assignments_[KeyId(id, key.text())].push_back(line);
}

IniDocument::Place IniDocument::AddSection(const IniSection& section) {
  const bool below_text = !lines_.empty() && lines_.back().text.find_first_not_of(" \t\r\n") != std::string::npos;
  if (below_text) Append(line_end_);
  Append("[" + section.text() + "]" + line_end_);
  return std::prev(lines_.end());
}

bool IniDocument::Remove(std::string_view section, std::string_view key) {
  const auto found = assignments_.find(KeyId(SectionId(section), key));
  if (found == assignments_.end()) return false;
  EndLastLine();
  for (const Place line : found->second) {
    Place& last = last_of_[line->section];
    if (last == line) last = LastBefore(line);
    lines_.erase(line);
  }
  assignments_.erase(found);
  return true;
}

// The assignment or the section line before one of a section's assignments.
IniDocument::Place IniDocument::LastBefore(Place line) {
  const std::string& section = line->section;
  do {
    --line;
  } while (line->section != section);
  return line;
}

}  // namespace vorn

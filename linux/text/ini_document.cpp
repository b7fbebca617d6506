#include "ini_document.h"

#include <algorithm>
#include <iterator>

#include "ascii.h"

namespace vorn {
namespace {

bool IsSame(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return LowerAscii(x) == LowerAscii(y); });
}

bool HasMeaning(IniLine::Kind kind) { return kind == IniLine::Kind::kAssignment || kind == IniLine::Kind::kInclude; }

}  // namespace

// FNV-1a over the key in lower case.
std::size_t IniDocument::HashKeyId::operator()(const KeyId& id) const {
  std::uint64_t hash = 14695981039346656037U ^ id.section;
  for (const char c : id.key) hash = (hash ^ static_cast<unsigned char>(LowerAscii(c))) * 1099511628211U;
  return static_cast<std::size_t>(hash ^ hash >> 32);
}

bool IniDocument::SameKeyId::operator()(const KeyId& a, const KeyId& b) const {
  return a.section == b.section && IsSame(a.key, b.key);
}

IniDocument IniDocument::Parse(std::string_view text) {
  IniDocument document;
  document.current_ = document.NumberOf(kInherited);
  std::string_view rest = document.texts_.emplace_back(text);
  const std::string_view read = rest.substr(0, rest.find('\0'));
  const std::size_t first_end = read.find('\n');
  if (first_end != std::string_view::npos && first_end > 0 && read[first_end - 1] == '\r') document.line_end_ = "\r\n";
  document.deciding_.reserve(static_cast<std::size_t>(std::count(read.begin(), read.end(), '\n')));
  std::size_t at = 0;
  while (const std::size_t length = IniLineLength(read.substr(at))) {
    document.Append(read.substr(at, length));
    at += length;
  }
  document.tail_ = rest.substr(at);
  return document;
}

// Appends a line to those that the reader reads.
void IniDocument::Append(std::string_view text) {
  Line line = MakeLine(text, kNoSection);
  line.number = line_number_;
  line_number_ += static_cast<int>(std::count(text.begin(), text.end(), '\n'));
  const IniLine& content = line.content;
  if (content.kind == IniLine::Kind::kBadSection) current_ = kNoSection;
  if (content.kind == IniLine::Kind::kSection) {
    current_ = NumberOf(content.name);
    current_has_argument_ = content.argument.has_value();
  }
  if (content.kind == IniLine::Kind::kSection || HasMeaning(content.kind)) line.section = current_;
  line.has_argument = current_has_argument_;
  lines_.push_back(line);
  if (lines_.back().section != kNoSection) Index(std::prev(lines_.end()));
}

IniDocument::Line IniDocument::MakeLine(std::string_view text, SectionNumber section) {
  std::string_view joined = text;
  if (text.find("\\\n") != std::string_view::npos) joined = texts_.emplace_back(JoinIniLine(text));
  return {text, ReadIniLine(joined), 0, section, false, false, {}};
}

void IniDocument::Index(Place line) {
  if (!line->has_argument) sections_[line->section].last = line;
  if (line->content.value.empty()) return;
  if (line->content.kind == IniLine::Kind::kInclude) includes_.push_back(line);
  if (line->content.kind != IniLine::Kind::kAssignment) return;
  has_reference_ = has_reference_ || line->content.value.front() == '$';
  const auto [found, is_new] = deciding_.try_emplace(KeyId{line->section, line->content.name}, line);
  line->decides = true;
  if (is_new) return;
  line->earlier = found->second;
  found->second->decides = false;
  found->second = line;
}

IniDocument::SectionNumber IniDocument::NumberOf(std::string_view name) {
  const std::string lower = LowerAscii(name);
  const auto [found, is_new] = section_numbers_.try_emplace(lower, static_cast<SectionNumber>(sections_.size()));
  if (is_new) sections_.push_back({lower, {}});
  return found->second;
}

IniDocument::SectionNumber IniDocument::Known(std::string_view name) const {
  const auto found = section_numbers_.find(LowerAscii(name));
  return found == section_numbers_.end() ? kNoSection : found->second;
}

std::string IniDocument::Text() const {
  std::string text;
  for (const Line& line : lines_) text += line.text;
  return text.append(tail_);
}

std::string IniDocument::TextWithout(std::string_view section) const {
  const SectionNumber number = Known(section);
  std::string text;
  for (const Line& line : lines_) {
    const bool is_dropped = line.section == number && line.content.kind == IniLine::Kind::kAssignment;
    if (number == kNoSection || !is_dropped) text += line.text;
  }
  return text.append(tail_);
}

const IniDocument::Line* IniDocument::FindLine(std::string_view section, std::string_view key) const {
  const auto found = deciding_.find(KeyId{Known(section), key});
  return found == deciding_.end() ? nullptr : &*found->second;
}

std::optional<IniSetting> IniDocument::FindLast(std::string_view section, std::string_view key) const {
  const Line* line = FindLine(section, key);
  if (line == nullptr) return std::nullopt;
  return IniSetting{line->content.name, line->content.value, line->number, line->has_argument};
}

std::optional<IniSetting> IniDocument::Find(std::string_view section, std::string_view key) const {
  const std::optional<IniSetting> last = FindLast(section, key);
  return last && !last->is_hidden ? last : std::nullopt;
}

std::optional<std::string> IniDocument::Get(std::string_view section, std::string_view key) const {
  const std::optional<IniSetting> setting = Find(section, key);
  if (!setting) return std::nullopt;
  return std::string(setting->value);
}

std::vector<IniSetting> IniDocument::Settings(std::string_view section) const {
  std::vector<IniSetting> settings;
  const SectionNumber number = Known(section);
  if (number == kNoSection) return settings;
  for (const Line& line : lines_) {
    if (line.section != number || !line.decides || line.has_argument) continue;
    settings.push_back({line.content.name, line.content.value, line.number});
  }
  return settings;
}

std::vector<IniEntry> IniDocument::Entries(std::string_view section) const {
  std::vector<IniEntry> entries;
  for (const IniSetting& setting : Settings(section)) {
    entries.push_back({std::string(setting.key), std::string(setting.value)});
  }
  return entries;
}

std::vector<IniInclude> IniDocument::Includes() const {
  std::vector<IniInclude> includes;
  for (const Place line : includes_) {
    includes.push_back({std::nullopt, std::string(line->content.value), line->number});
    if (!line->has_argument) includes.back().section = sections_[line->section].name;
  }
  return includes;
}

std::vector<IniReference> IniDocument::References() const {
  std::vector<IniReference> references;
  if (!has_reference_) return references;
  for (const Line& line : lines_) {
    if (!line.decides || line.has_argument || line.content.value.front() != '$') continue;
    references.push_back({sections_[line.section].name, line.content.name});
  }
  return references;
}

void IniDocument::Set(const IniSection& section, const IniKey& key, const IniValue& value) {
  const auto found = deciding_.find(KeyId{Known(section.text()), key.text()});
  if (found != deciding_.end() && found->second->has_argument) return;
  if (found != deciding_.end()) return Replace(found->second, value);
  const SectionNumber known = Known(section.text());
  Insert(known == kNoSection || !sections_[known].last ? AddSection(section) : known, key, value);
}

void IniDocument::Replace(Place line, const IniValue& value) {
  const IniLine old = line->content;
  if (old.value == value.text()) return;
  const std::string head(line->text.substr(0, old.value_begin));
  std::string text = head + Rendered(value) + std::string(line->text.substr(old.value_end));
  // Text after the quotes of the old value is dropped if it is not a comment.
  const bool is_read = ReadIniLine(JoinIniLine(text)).value == value.text();
  if (!is_read) text = std::string(old.name) + " = " + Rendered(value) + line_end_;
  const KeyId id{line->section, old.name};
  auto entry = deciding_.extract(id);  // its key is a view of the old text
  Line changed = MakeLine(texts_.emplace_back(std::move(text)), line->section);
  changed.number = line->number;
  changed.decides = line->decides;
  changed.earlier = line->earlier;
  *line = changed;
  entry.key() = KeyId{line->section, line->content.name};
  deciding_.insert(std::move(entry));
}

void IniDocument::Insert(SectionNumber section, const IniKey& key, const IniValue& value) {
  const Place after = *sections_[section].last;
  const std::string& text = texts_.emplace_back(key.text() + " = " + Rendered(value) + line_end_);
  const Place line = lines_.insert(std::next(after), MakeLine(text, section));
  line->number = after->number;
  Index(line);
}

IniDocument::SectionNumber IniDocument::AddSection(const IniSection& section) {
  const bool below_text = !lines_.empty() && lines_.back().text.find_first_not_of(" \t\r\n") != std::string::npos;
  if (below_text) Append(line_end_);
  Append(texts_.emplace_back("[" + section.text() + "]" + line_end_));
  return current_;
}

bool IniDocument::Remove(std::string_view section, std::string_view key) {
  const auto found = deciding_.find(KeyId{Known(section), key});
  if (found == deciding_.end() || found->second->has_argument) return false;
  std::vector<Place> hidden;  // the last one first
  std::optional<Place> line = found->second;
  deciding_.erase(found);
  while (line) {
    const std::optional<Place> earlier = (*line)->earlier;
    if ((*line)->has_argument) {
      hidden.push_back(*line);
    } else {
      Erase(*line);
    }
    line = earlier;
  }
  for (auto place = hidden.rbegin(); place != hidden.rend(); ++place) {
    (*place)->earlier = std::nullopt;
    Index(*place);
  }
  return true;
}

// Erases an assignment. The header of the section precedes it and becomes the section's last line if no other is left.
void IniDocument::Erase(Place line) {
  std::optional<Place>& last = sections_[line->section].last;
  if (last == line) {
    Place before = line;
    const auto is_own = [&](Place other) { return other->section == line->section && !other->has_argument; };
    while (before != lines_.begin() && !is_own(--before)) continue;
    last = is_own(before) && before != line ? std::optional<Place>(before) : std::nullopt;
  }
  lines_.erase(line);
}

}  // namespace vorn

#include "ini_document.h"

#include <algorithm>
#include <utility>

#include "ascii.h"
#include "nfs_utils.h"

namespace vorn {
namespace {

bool IsSame(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return LowerAscii(x) == LowerAscii(y); });
}

bool HasMeaning(IniLine::Kind kind) { return kind == IniLine::Kind::kAssignment || kind == IniLine::Kind::kInclude; }

// Whether a line consists of several, of which each but the last one ends with a backslash.
bool IsJoined(std::string_view line) { return line.find("\\\n") != std::string_view::npos; }

// FNV-1a over the key in lower case.
std::uint32_t HashOf(std::uint32_t section, std::string_view key) {
  std::uint64_t hash = 14695981039346656037U ^ section;
  for (const char c : key) hash = (hash ^ static_cast<unsigned char>(LowerAscii(c))) * 1099511628211U;
  return static_cast<std::uint32_t>(hash ^ hash >> 32);
}

}  // namespace

IniDocument IniDocument::Parse(std::string_view text) {
  IniDocument document;
  document.current_ = document.NumberOf(kInherited);
  std::string_view rest = document.texts_.emplace_back(text);
  const std::string_view read = rest.substr(0, rest.find('\0'));
  const std::size_t first_end = read.find('\n');
  if (first_end != std::string_view::npos && first_end > 0 && read[first_end - 1] == '\r') document.line_end_ = "\r\n";
  const auto lines = static_cast<std::size_t>(std::count(read.begin(), read.end(), '\n'));
  document.lines_.reserve(lines);
  document.Rehash(lines);
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
  line_number_ += IsJoined(text) ? static_cast<int>(std::count(text.begin(), text.end(), '\n')) : 1;
  if (line.kind == IniLine::Kind::kBadSection) current_ = kNoSection;
  if (line.kind == IniLine::Kind::kSection) {
    current_ = NumberOf(line.name);
    current_has_argument_ = line.has_argument;
  }
  if (line.kind == IniLine::Kind::kSection || HasMeaning(line.kind)) line.section = current_;
  line.has_argument = current_has_argument_;
  const auto place = static_cast<Place>(lines_.size());
  lines_.push_back(line);
  LinkAfter(last_, place);
  if (line.section != kNoSection) Index(place);
}

// has_argument is true for the header of a section with an argument.
IniDocument::Line IniDocument::MakeLine(std::string_view text, SectionNumber section) {
  std::string_view joined = text;
  if (IsJoined(text)) joined = texts_.emplace_back(JoinIniLine(text));
  const IniLine content = ReadIniLine(joined);
  Line line;
  line.text = text;
  line.name = content.name;
  line.value = content.value;
  line.kind = content.kind;
  line.section = section;
  line.has_argument = content.argument.has_value();
  return line;
}

void IniDocument::Index(Place place) {
  Line& line = lines_[place];
  if (!line.has_argument) sections_[line.section].last = place;
  if (line.value.empty()) return;
  if (line.kind == IniLine::Kind::kInclude) includes_.push_back(place);
  const bool counts = !line.has_argument || kArgumentsHideValues;
  if (line.kind != IniLine::Kind::kAssignment || !counts) return;
  has_reference_ = has_reference_ || line.value.front() == '$';
  Decide(place);
}

// Inserts a line behind another one, or as the first line.
void IniDocument::LinkAfter(Place before, Place place) {
  Line& line = lines_[place];
  line.previous = before;
  line.next = before == kNowhere ? first_ : lines_[before].next;
  (before == kNowhere ? first_ : lines_[before].next) = place;
  (line.next == kNowhere ? last_ : lines_[line.next].previous) = place;
}

void IniDocument::Unlink(Place place) {
  const Line& line = lines_[place];
  (line.previous == kNowhere ? first_ : lines_[line.previous].next) = line.next;
  (line.next == kNowhere ? last_ : lines_[line.next].previous) = line.previous;
}

// The slot of the key, or else the unused slot at which its search ends.
std::size_t IniDocument::FindSlot(SectionNumber section, std::string_view key, std::uint32_t hash) const {
  const std::size_t mask = slots_.size() - 1;
  std::size_t at = hash & mask;
  for (; slots_[at].line != kNowhere; at = (at + 1) & mask) {
    if (slots_[at].hash != hash || slots_[at].line == kRemoved) continue;
    const Line& line = lines_[slots_[at].line];
    if (line.section == section && IsSame(line.name, key)) break;
  }
  return at;
}

// Makes the line the one that gives its key the value that counts.
void IniDocument::Decide(Place place) {
  if (2 * used_slots_ >= slots_.size()) Rehash(2 * used_slots_);
  Line& line = lines_[place];
  const std::uint32_t hash = HashOf(line.section, line.name);
  Slot& slot = slots_[FindSlot(line.section, line.name, hash)];
  line.decides = true;
  line.earlier = slot.line;
  if (slot.line == kNowhere) ++used_slots_;
  if (slot.line != kNowhere) lines_[slot.line].decides = false;
  slot = {hash, place};
}

// Makes room for this number of keys.
void IniDocument::Rehash(std::size_t keys) {
  std::size_t size = 8;
  while (size < 2 * keys) size *= 2;
  const std::vector<Slot> old = std::exchange(slots_, std::vector<Slot>(size));
  used_slots_ = 0;
  for (const Slot& slot : old) {
    if (slot.line == kNowhere || slot.line == kRemoved) continue;
    std::size_t at = slot.hash & (size - 1);
    while (slots_[at].line != kNowhere) at = (at + 1) & (size - 1);
    slots_[at] = slot;
    ++used_slots_;
  }
}

IniDocument::SectionNumber IniDocument::NumberOf(std::string_view name) {
  const std::string lower = LowerAscii(name);
  const auto [found, is_new] = section_numbers_.try_emplace(lower, static_cast<SectionNumber>(sections_.size()));
  if (is_new) sections_.push_back({lower, kNowhere});
  return found->second;
}

IniDocument::SectionNumber IniDocument::Known(std::string_view name) const {
  const auto found = section_numbers_.find(LowerAscii(name));
  return found == section_numbers_.end() ? kNoSection : found->second;
}

std::string IniDocument::Text() const {
  std::string text;
  for (Place place = first_; place != kNowhere; place = lines_[place].next) text += lines_[place].text;
  return text.append(tail_);
}

std::string IniDocument::TextWithout(std::string_view section) const {
  const SectionNumber number = Known(section);
  std::string text;
  for (Place place = first_; place != kNowhere; place = lines_[place].next) {
    const Line& line = lines_[place];
    const bool is_dropped = line.section == number && line.kind == IniLine::Kind::kAssignment;
    if (number == kNoSection || !is_dropped) text += line.text;
  }
  return text.append(tail_);
}

// The line that gives the key its value, or kNowhere.
IniDocument::Place IniDocument::FindPlace(SectionNumber section, std::string_view key) const {
  return slots_[FindSlot(section, key, HashOf(section, key))].line;
}

std::optional<IniSetting> IniDocument::FindLast(std::string_view section, std::string_view key) const {
  const Place place = FindPlace(Known(section), key);
  if (place == kNowhere) return std::nullopt;
  const Line& line = lines_[place];
  return IniSetting{line.name, line.value, line.number, line.has_argument};
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
  settings.reserve(used_slots_);
  for (Place place = first_; place != kNowhere; place = lines_[place].next) {
    const Line& line = lines_[place];
    if (line.section != number || !line.decides || line.has_argument) continue;
    settings.push_back({line.name, line.value, line.number});
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
  for (const Place place : includes_) {
    const Line& line = lines_[place];
    includes.push_back({sections_[line.section].name, line.has_argument, std::string(line.value), line.number});
  }
  return includes;
}

std::vector<IniReference> IniDocument::References() const {
  std::vector<IniReference> references;
  if (!has_reference_) return references;
  for (Place place = first_; place != kNowhere; place = lines_[place].next) {
    const Line& line = lines_[place];
    if (!line.decides || line.has_argument || line.value.front() != '$') continue;
    references.push_back({sections_[line.section].name, line.name});
  }
  return references;
}

void IniDocument::Set(const IniSection& section, const IniKey& key, const IniValue& value) {
  const SectionNumber known = Known(section.text());
  const Place place = FindPlace(known, key.text());
  if (place != kNowhere && lines_[place].has_argument) return;
  if (place != kNowhere) return Replace(place, value);
  const bool has_line = known != kNoSection && sections_[known].last != kNowhere;
  Insert(has_line ? known : AddSection(section), key, value);
}

void IniDocument::Replace(Place place, const IniValue& value) {
  Line& line = lines_[place];
  if (line.value == value.text()) return;
  const IniLine old = ReadIniLine(JoinIniLine(line.text));
  const std::string head(line.text.substr(0, old.value_begin));
  std::string text = head + Rendered(value) + std::string(line.text.substr(old.value_end));
  // Text after the quotes of the old value is dropped if it is not a comment.
  const bool is_read = ReadIniLine(JoinIniLine(text)).value == value.text();
  if (!is_read) text = std::string(line.name) + " = " + Rendered(value) + line_end_;
  const Line changed = MakeLine(texts_.emplace_back(std::move(text)), line.section);
  line.text = changed.text;
  line.name = changed.name;
  line.value = changed.value;
}

void IniDocument::Insert(SectionNumber section, const IniKey& key, const IniValue& value) {
  const Place after = sections_[section].last;
  const std::string& text = texts_.emplace_back(key.text() + " = " + Rendered(value) + line_end_);
  Line line = MakeLine(text, section);
  line.number = lines_[after].number;
  const auto place = static_cast<Place>(lines_.size());
  lines_.push_back(line);
  LinkAfter(after, place);
  Index(place);
}

IniDocument::SectionNumber IniDocument::AddSection(const IniSection& section) {
  const bool below_text =
      last_ != kNowhere && lines_[last_].text.find_first_not_of(" \t\r\n") != std::string_view::npos;
  if (below_text) Append(line_end_);
  Append(texts_.emplace_back("[" + section.text() + "]" + line_end_));
  return current_;
}

bool IniDocument::Remove(std::string_view section, std::string_view key) {
  const SectionNumber number = Known(section);
  Slot& slot = slots_[FindSlot(number, key, HashOf(number, key))];
  if (slot.line == kNowhere || lines_[slot.line].has_argument) return false;
  std::vector<Place> hidden;  // the last one first
  Place place = std::exchange(slot.line, kRemoved);
  while (place != kNowhere) {
    const Place earlier = lines_[place].earlier;
    if (lines_[place].has_argument) {
      hidden.push_back(place);
    } else {
      Erase(place);
    }
    place = earlier;
  }
  for (auto line = hidden.rbegin(); line != hidden.rend(); ++line) Index(*line);
  return true;
}

// Erases an assignment. The header of the section precedes it and becomes the section's last line if no other is left.
void IniDocument::Erase(Place place) {
  const SectionNumber section = lines_[place].section;
  if (sections_[section].last == place) {
    const auto is_own = [&](const Line& line) { return line.section == section && !line.has_argument; };
    Place before = lines_[place].previous;
    while (before != kNowhere && !is_own(lines_[before])) before = lines_[before].previous;
    sections_[section].last = before;
  }
  Unlink(place);
}

}  // namespace vorn

#include "ini_document.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "ascii.h"
#include "nfs_utils.h"

namespace vorn {
namespace {

bool IsSame(std::string_view a, std::string_view b) {
  return std::equal(a.begin(), a.end(), b.begin(), b.end(),
                    [](char x, char y) { return LowerAscii(x) == LowerAscii(y); });
}

constexpr std::size_t kAhead = 32;  // slots that are fetched before they are used

bool HasMeaning(IniLine::Kind kind) { return kind == IniLine::Kind::kAssignment || kind == IniLine::Kind::kInclude; }

// Whether a line consists of several, of which each but the last one ends with a backslash.
bool IsJoined(std::string_view line) { return line.find("\\\n") != std::string_view::npos; }

// Eight characters in lower case, as a number.
std::uint64_t LowerWord(const char* text) {
  char bytes[sizeof(std::uint64_t)];
  std::memcpy(bytes, text, sizeof bytes);
  for (char& c : bytes) c = LowerAscii(c);
  std::uint64_t word = 0;
  std::memcpy(&word, bytes, sizeof word);
  return word;
}

// FNV-1a, but by words: the upper half of each product is mixed into the lower half, which does not depend on it.
std::uint64_t Mix(std::uint64_t hash, std::uint64_t word) {
  hash = (hash ^ word) * 1099511628211U;
  return hash ^ hash >> 32;
}

// A hash of the key in lower case.
std::uint32_t HashOf(std::uint32_t section, std::string_view key) {
  std::uint64_t hash = 14695981039346656037U ^ section;
  for (; key.size() >= sizeof hash; key.remove_prefix(sizeof hash)) hash = Mix(hash, LowerWord(key.data()));
  std::uint64_t rest = 0;
  for (const char c : key) rest = rest << 8U | static_cast<unsigned char>(LowerAscii(c));
  return static_cast<std::uint32_t>(Mix(hash, rest));
}

std::vector<IniLineExtent> SplitIniLines(std::string_view text) {
  std::vector<IniLineExtent> lines;
  for (;;) {
    const IniLineExtent line = FirstIniLine(text);
    if (line.length == 0) return lines;
    lines.push_back(line);
    text.remove_prefix(line.length);
  }
}

}  // namespace

IniDocument IniDocument::Parse(std::string text) {
  IniDocument document;
  document.current_ = document.NumberOf(kInherited);
  std::string_view rest = document.texts_.emplace_back(std::move(text));
  const std::string_view read = rest.substr(0, rest.find('\0'));
  const std::size_t first_end = read.find('\n');
  if (first_end != std::string_view::npos && first_end > 0 && read[first_end - 1] == '\r') document.line_end_ = "\r\n";
  const std::vector<IniLineExtent> lines = SplitIniLines(read);
  document.lines_.reserve(lines.size());
  document.Rehash(lines.size());
  std::vector<Slot> assignments;
  std::size_t at = 0;
  for (const IniLineExtent& extent : lines) {
    document.Append(read.substr(at, extent.length), extent.line_feeds);
    at += extent.length;
    const Line& line = document.lines_.back();
    if (!line.GivesValue()) continue;
    assignments.push_back({HashOf(line.section, line.name), document.last_});
    document.FetchSlot(assignments.back().hash);
    if (assignments.size() == kAhead) document.DecideAll(&assignments);
  }
  document.tail_ = rest.substr(at);
  document.DecideAll(&assignments);
  return document;
}

// Appends a line to those that the reader reads.
void IniDocument::Append(std::string_view text, int line_feeds) {
  const auto place = static_cast<Place>(lines_.size());
  Line& line = lines_.emplace_back();
  const bool has_argument = Fill(text, line_feeds > 1, &line);
  line.number = line_number_;
  line_number_ += line_feeds;
  if (line.kind == IniLine::Kind::kBadSection) current_ = kNoSection;
  if (line.kind == IniLine::Kind::kSection) {
    current_ = NumberOf(line.name);
    current_has_argument_ = has_argument;
  }
  if (line.kind == IniLine::Kind::kSection || HasMeaning(line.kind)) line.section = current_;
  line.has_argument = current_has_argument_;
  LinkAfter(last_, place);
  if (line.section != kNoSection) Enlist(place);
}

// Returns whether the line is the header of a section with an argument.
bool IniDocument::Fill(std::string_view text, bool is_joined, Line* line) {
  const IniLine content = ReadIniLine(is_joined ? texts_.emplace_back(JoinIniLine(text)) : text);
  line->text = text;
  line->name = content.name;
  line->value = content.value;
  line->kind = content.kind;
  return content.argument.has_value();
}

// Whether the line gives its key a value, or hides one.
bool IniDocument::Line::GivesValue() const {
  const bool counts = !has_argument || kArgumentsHideValues;
  return section != kNoSection && kind == IniLine::Kind::kAssignment && !value.empty() && counts;
}

// Adds a line with meaning to what the document knows of its section.
void IniDocument::Enlist(Place place) {
  const Line& line = lines_[place];
  if (!line.has_argument) sections_[line.section].last = place;
  if (line.kind == IniLine::Kind::kInclude && !line.value.empty()) includes_.push_back(place);
  has_reference_ = has_reference_ || (line.GivesValue() && line.value.front() == '$');
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

// Makes the line of an assignment the one that gives its key the value that counts.
void IniDocument::Decide(const Slot& assignment) {
  if (2 * used_slots_ >= slots_.size()) Rehash(2 * used_slots_);
  Line& line = lines_[assignment.line];
  Slot& slot = slots_[FindSlot(line.section, line.name, assignment.hash)];
  line.decides = true;
  line.earlier = slot.line;
  if (slot.line == kNowhere) ++used_slots_;
  if (slot.line != kNowhere) lines_[slot.line].decides = false;
  slot = assignment;
}

void IniDocument::DecideAll(std::vector<Slot>* assignments) {
  for (const Slot& assignment : *assignments) Decide(assignment);
  assignments->clear();
}

// Mostly the slot of a key is not in the processor's cache, and takes longer to fetch than a line takes to parse.
void IniDocument::FetchSlot(std::uint32_t hash) const { __builtin_prefetch(&slots_[hash & (slots_.size() - 1)], 1); }

void IniDocument::Index(Place place) {
  Enlist(place);
  const Line& line = lines_[place];
  if (line.GivesValue()) Decide({HashOf(line.section, line.name), place});
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

std::vector<IniEntry> IniDocument::Entries(std::string_view section) const {
  std::vector<IniEntry> entries;
  VisitSettings(section, [&](const IniSetting& setting) {
    entries.push_back({std::string(setting.key), std::string(setting.value)});
  });
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
  const bool is_joined = IsJoined(text);
  Fill(texts_.emplace_back(std::move(text)), is_joined, &line);
}

void IniDocument::Insert(SectionNumber section, const IniKey& key, const IniValue& value) {
  const Place after = sections_[section].last;
  const std::string& text = texts_.emplace_back(key.text() + " = " + Rendered(value) + line_end_);
  const auto place = static_cast<Place>(lines_.size());
  Line& line = lines_.emplace_back();
  Fill(text, IsJoined(text), &line);
  line.section = section;
  line.number = lines_[after].number;
  LinkAfter(after, place);
  Index(place);
}

IniDocument::SectionNumber IniDocument::AddSection(const IniSection& section) {
  const bool below_text =
      last_ != kNowhere && lines_[last_].text.find_first_not_of(" \t\r\n") != std::string_view::npos;
  if (below_text) Append(line_end_, 1);
  Append(texts_.emplace_back("[" + section.text() + "]" + line_end_), 1);
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

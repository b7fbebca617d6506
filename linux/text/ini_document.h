// An INI file as nfs-utils reads it, edited in place: every byte that an edit does not concern is preserved.
#ifndef VORN_LINUX_TEXT_INI_DOCUMENT_H
#define VORN_LINUX_TEXT_INI_DOCUMENT_H

#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "ini_line.h"
#include "ini_text.h"

namespace vorn {

// A value and the line that gives it. The views are valid until the document is edited or destroyed.
struct IniSetting {
  std::string_view key;  // as it is spelled in the file
  std::string_view value;
  int line = 0;  // counted from 1
  bool is_hidden = false;
};

struct IniEntry {
  std::string key;  // as it is spelled in the file
  std::string value;
};

// A line "include = file" with a value. The reader reads the file as if it were in the place of the line.
struct IniInclude {
  std::string section;        // in which the file begins, in lower case
  bool has_argument = false;  // whether that is [section "argument"]
  std::string file;
  int line = 0;
};

// A value "$name", which stands for that of another key.
struct IniReference {
  std::string section;
  std::string_view key;
};

// If several lines give a key a value, the last one counts, over all blocks of a section. Lines without a value are
// ignored, as by the reader. Values in a section with an argument, [name "argument"], cannot be asked for here. For
// readers that keep one value for both sections (kArgumentsHideValues) they hide what an earlier line gives the same
// key in [name].
//
// The reader ignores a last line without line feed, and everything from a NUL byte on. An edit leaves that tail at
// the end of the file, without effect.
//
// Parsing takes time in proportion to the text, and every other operation but VisitSettings and Entries takes
// constant time plus the time for the lines of its key. Reading is thread-safe; editing is not.
class IniDocument {
 public:
  static IniDocument Parse(std::string text);

  IniDocument(IniDocument&&) = default;  // the lines refer to the texts: a document is moved, never copied
  IniDocument& operator=(IniDocument&&) = default;

  std::string Text() const;

  // The text without the assignments of a section, also those in [section "argument"].
  std::string TextWithout(std::string_view section) const;

  // The section name under which the lines before the first section header are found. In a file that is included
  // they belong to the section of the include line; elsewhere the reader ignores them.
  static constexpr std::string_view kInherited = "]";

  // The setting that counts; nullopt if the key has no value. A reference "$name" is not resolved.
  std::optional<IniSetting> Find(std::string_view section, std::string_view key) const;

  // The last line that gives the key a value, also if it is in a section with an argument and so hides the key.
  std::optional<IniSetting> FindLast(std::string_view section, std::string_view key) const;

  bool HasSection(std::string_view section) const { return Known(section) != kNoSection; }

  std::optional<std::string> Get(std::string_view section, std::string_view key) const;

  // Passes the settings of a section that count to `visit`, in file order.
  template <typename Visit>
  void VisitSettings(std::string_view section, const Visit& visit) const {
    const SectionNumber number = Known(section);
    if (number == kNoSection) return;
    for (Place place = first_; place != kNowhere; place = lines_[place].next) {
      const Line& line = lines_[place];
      if (line.section == number && line.decides && !line.has_argument) visit({line.name, line.value, line.number});
    }
  }

  std::vector<IniEntry> Entries(std::string_view section) const;

  // At least the number of settings of all sections together.
  std::size_t SettingsAtMost() const { return used_slots_; }

  std::vector<IniInclude> Includes() const;

  // The keys that have a reference as the value that counts. Takes constant time if the parsed text has no reference.
  std::vector<IniReference> References() const;

  // Replaces the value on the line that counts. A new key is inserted after the last assignment of the section, a
  // new section at the end. Nothing is changed if the key has the value already, or if it is hidden.
  void Set(const IniSection& section, const IniKey& key, const IniValue& value);

  // Removes every line that gives the key a value, except in sections with an argument. Returns false if the key has
  // no value.
  bool Remove(std::string_view section, std::string_view key);

 private:
  IniDocument() = default;

  using Place = std::uint32_t;  // an index of lines_
  static constexpr Place kNowhere = UINT32_MAX;

  using SectionNumber = std::uint32_t;
  static constexpr SectionNumber kNoSection = 0;  // assignments are ignored

  // A line of the file. The lines form a list in file order through their indexes.
  struct Line {
    std::string_view text;
    std::string_view name;
    std::string_view value;
    SectionNumber section = kNoSection;  // of a line with meaning
    int number = 0;
    Place previous = kNowhere;
    Place next = kNowhere;
    Place earlier = kNowhere;  // the line before that gives the same key a value
    IniLine::Kind kind = IniLine::Kind::kOther;
    bool has_argument = false;  // whether its section has one
    bool decides = false;       // whether it gives its key the value that counts

    bool GivesValue() const;
  };

  // An entry of the hash table of keys, which is probed linearly.
  struct Slot {
    std::uint32_t hash = 0;  // of the key
    Place line = kNowhere;   // that gives the key its value; kNowhere in an entry that was never used
  };
  static constexpr Place kRemoved = kNowhere - 1;

  struct Section {
    std::string name;       // lower case; without an argument
    Place last = kNowhere;  // its last assignment without an argument, or its header if it has no assignment
  };

  void Append(std::string_view text, int line_feeds);
  bool Fill(std::string_view text, bool is_joined, Line* line);
  void Enlist(Place place);
  void Index(Place place);
  SectionNumber NumberOf(std::string_view name);
  SectionNumber Known(std::string_view name) const;
  Place FindPlace(SectionNumber section, std::string_view key) const;
  void Replace(Place place, const IniValue& value);
  void Insert(SectionNumber section, const IniKey& key, const IniValue& value);
  SectionNumber AddSection(const IniSection& section);
  void Erase(Place place);
  void LinkAfter(Place before, Place place);
  void Unlink(Place place);

  std::size_t FindSlot(SectionNumber section, std::string_view key, std::uint32_t hash) const;
  void Decide(const Slot& assignment);
  void DecideAll(std::vector<Slot>* assignments);
  void FetchSlot(std::uint32_t hash) const;
  void Rehash(std::size_t keys);

  std::deque<std::string> texts_;  // the file, and the lines that were joined or changed; the views point into them
  std::vector<Line> lines_;        // all complete lines, also the erased ones
  Place first_ = kNowhere;
  Place last_ = kNowhere;
  std::string_view tail_;                    // the rest of the file, which the reader ignores
  int line_number_ = 1;                      // of the next line
  std::vector<Section> sections_{{"", {}}};  // by number; the first one is kNoSection
  std::unordered_map<std::string, SectionNumber> section_numbers_;
  SectionNumber current_ = kNoSection;  // the section at the end
  bool current_has_argument_ = false;
  std::vector<Slot> slots_;  // their number is a power of two, and at least twice used_slots_
  std::size_t used_slots_ = 0;
  bool has_reference_ = false;   // no edit adds one
  std::vector<Place> includes_;  // in order; no edit adds or removes one
  const char* line_end_ = "\n";
};

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_DOCUMENT_H

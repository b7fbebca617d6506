// An INI file as nfs-utils reads it, edited in place: what no edit concerns comes back byte for byte.
#ifndef VORN_LINUX_TEXT_INI_DOCUMENT_H
#define VORN_LINUX_TEXT_INI_DOCUMENT_H

#include <list>
#include <optional>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "ini_line.h"
#include "ini_text.h"

namespace vorn {

struct IniEntry {
  std::string key;  // as it is spelled in the file
  std::string value;
};

// Of several lines for one key the last that has a value counts, over all blocks of a section.
// Include lines are kept and not followed. A last line without line feed has no effect, as for the
// reader, until an edit ends it. Sections with an argument are kept apart and cannot be asked for.
class IniDocument {
 public:
  // None when the text has a NUL byte: the reader would take it for the end.
  static std::optional<IniDocument> Parse(std::string_view text);

  IniDocument(IniDocument&&) = default;  // the index points into the lines: moved, never copied
  IniDocument& operator=(IniDocument&&) = default;

  std::string Text() const;

  // The value that counts; a reference "$name" is given as it stands.
  std::optional<std::string> Get(std::string_view section, std::string_view key) const;

  // The keys of a section that have a value, in the order of the lines that give it.
  std::vector<IniEntry> Entries(std::string_view section) const;

  // The number of the line, from 1, that gives the value; 0 when none does.
  int LineOf(std::string_view section, std::string_view key) const;

  // Ends a last line without line feed, which gives it effect.
  void EndLastLine();

  // Changes the value where it stands. A new key comes after the section's last one, a new section
  // at the end. What has the value already is not touched.
  void Set(const IniSection& section, const IniKey& key, const IniValue& value);

  // Removes every line for the key. False when there was none.
  bool Remove(std::string_view section, std::string_view key);

 private:
  IniDocument() = default;

  struct Line {
    std::string text;
    IniLine content;
    std::string section;  // folded; of an assignment that counts, and of a section line
  };
  using Lines = std::list<Line>;
  using Place = Lines::iterator;

  void Append(std::string_view text);
  void Register(Place line);
  const Line* Find(std::string_view section, std::string_view key) const;
  void Replace(Place line, const IniValue& value);
  void Insert(const IniSection& section, const IniKey& key, const IniValue& value);
  Place AddSection(const IniSection& section);
  Place LastBefore(Place line);

  Lines lines_;
  std::string current_;  // the folded section at the end, or empty
  // By folded section and key, in file order: all assignments, also those without a value.
  std::unordered_map<std::string, std::vector<Place>> assignments_;
  // By folded section: its last assignment, or its line when it has none.
  std::unordered_map<std::string, Place> last_of_;
  const char* line_end_ = "\n";
};

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_DOCUMENT_H

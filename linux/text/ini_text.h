// The strings that an INI file of nfs-utils can represent. Only these types are written to a file, so that no string
// of a caller can change the meaning of the rest of the file.
//
// The reader (nfs.conf(5), idmapd.conf(5)) accepts "[section]" and "key = value" lines. Names are compared without
// regard to ASCII case. In a value "#" and ";" begin a comment unless the value is quoted by " or '; a quote cannot
// be escaped; a leading "$" refers to a variable, also within quotes; an empty value counts as no value.
#ifndef VORN_LINUX_TEXT_INI_TEXT_H
#define VORN_LINUX_TEXT_INI_TEXT_H

#include <string>
#include <string_view>

#include "checked_text.h"

namespace vorn {

struct IniSectionRules {
  static bool Accepts(std::string_view text);
};
struct IniKeyRules {
  static bool Accepts(std::string_view text);
};
struct IniValueRules {
  static bool Accepts(std::string_view text);
};

using IniSection = CheckedText<IniSectionRules>;  // the name of a section
using IniKey = CheckedText<IniKeyRules>;          // the name of a key; "include" is the reader's own word
using IniValue = CheckedText<IniValueRules>;

IniValue NumberValue(int number);
IniValue SwitchValue(bool on);  // "y" or "n"

// The value as it is written to a file: quoted if necessary.
std::string Rendered(const IniValue& value);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_INI_TEXT_H

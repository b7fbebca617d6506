// The configuration file of vornd: vornd.conf(5).
#ifndef VORN_SERVER_SETTINGS_FILE_H
#define VORN_SERVER_SETTINGS_FILE_H

#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "settings.h"

namespace vorn::server {

// A position in a file; line and column are counted from 1, columns in bytes.
struct Place {
  int line = 0;
  int column = 0;
};

struct FileFault {
  Place place;
  std::string text;
};

// The settings of a file, and the positions of their values.
struct SettingsFile {
  Settings settings;
  std::map<const Setting*, Place> places{};
  std::vector<FileFault> faults{};  // in file order
};

// Parses the whole text and reports every fault of a line: unknown sections and keys, keys and sections that are given
// twice, values that are not accepted, and lines that are none of these. A setting with a fault has its default.
SettingsFile ParseSettings(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_SETTINGS_FILE_H

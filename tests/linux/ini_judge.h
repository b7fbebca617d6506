// Reads INI files with nfsconf(8), the reader of nfs-utils.
#ifndef VORN_TESTS_LINUX_INI_JUDGE_H
#define VORN_TESTS_LINUX_INI_JUDGE_H

#include <map>
#include <optional>
#include <string>
#include <string_view>

// Every section (with its argument, as "name \"argument\"") and every key that has a value. Names
// are in lower case.
using IniContent = std::map<std::string, std::map<std::string, std::string>>;

// Returns the content of a file with this text.
IniContent ReadByNfsconf(std::string_view text);

// Whether a value in [name "argument"] hides an earlier value of the same key in [name] from nfsconf(8). It does so
// before nfs-utils 2.8.3.
bool ArgumentsHideValues();

// Returns what nfsconf(8) prints of the file at `path` and the folder `path`.d; nullopt if it crashes, as it does if a
// file includes itself.
std::optional<std::string> DumpByNfsconf(const std::string& path);

// Returns the value of a key in the file at `path` and the folder `path`.d, as the services read them; empty if the
// key has no value, nullopt if the program does not end, as it does if a value refers to itself.
std::optional<std::string> GetByNfsconf(const std::string& path, const std::string& section, const std::string& key);

#endif  // VORN_TESTS_LINUX_INI_JUDGE_H

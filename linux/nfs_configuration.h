// nfs.conf(5) and the files beside it, as the services put them together.
#ifndef VORN_LINUX_NFS_CONFIGURATION_H
#define VORN_LINUX_NFS_CONFIGURATION_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "ini_file.h"
#include "status.h"

namespace vorn {

inline constexpr char kNfsConfFolder[] = "/etc/nfs.conf.d";
inline constexpr int kLargestPort = 65535;

class NFSConfiguration {
 public:
  // That of the current root.
  static Result<NFSConfiguration> Open();

  // Each reads a value, which stays as it is when no file has one: a number from 0 to `largest`, a switch (0 or 1),
  // a text of less than `size` bytes. Anything else is a failure that names file and line.
  Status Read(const char* section, const char* key, int largest, std::int32_t* value) const;
  Status Read(const char* section, const char* key, std::int32_t* value) const;
  Status Read(const char* section, const char* key, char* text, std::size_t size) const;

 private:
  Status Add(const std::string& path);
  const IniFile& Deciding(const char* section, const char* key) const;

  std::vector<IniFile> files_;  // a later one overrules an earlier one
};

}  // namespace vorn

#endif  // VORN_LINUX_NFS_CONFIGURATION_H

// nfs.conf(5): /etc/nfs.conf and the files of /etc/nfs.conf.d, as the NFS daemons combine them.
#ifndef VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H
#define VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "box.h"
#include "ini_file.h"
#include "status.h"

namespace vorn {

inline constexpr int kLargestPort = 65535;

class NFSConfiguration {
 public:
  // The configuration of the box.
  static Result<NFSConfiguration> Open(Box& box);

  // Each reads a value into its last argument, which is left alone if no file has the key: a number from 0 to
  // `largest`, a switch (0 or 1), a text of less than `size` bytes. A value of another form is a failure that
  // names file and line.
  Status Read(const char* section, const char* key, int largest, std::int32_t* value) const;
  Status Read(const char* section, const char* key, std::int32_t* value) const;
  Status Read(const char* section, const char* key, char* text, std::size_t size) const;

 private:
  Status Add(Box& box, const std::string& path);
  const IniFile& Deciding(const char* section, const char* key) const;

  std::vector<SharedIniFile> files_;  // a later file overrides an earlier one
};

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H

// The values of nfs.conf(5), each read as the daemon that it belongs to reads it.
#ifndef VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H
#define VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H

#include <optional>
#include <string>

#include "box.h"
#include "ini_files.h"
#include "status.h"

namespace vorn {

inline constexpr int kLargestPort = 65535;
inline constexpr char kNFSConfigurationFile[] = "/etc/nfs.conf";

// The values that are in force over all files of nfs.conf(5). A value that its reader cannot use counts as absent, as
// it does for the daemons; a warning that names its file and line is then logged once per version of the file.
class NFSConfiguration {
 public:
  // Reads the configuration of the box; with a draft, what it would be with that text.
  static Result<NFSConfiguration> Open(Box& box, const std::optional<IniFiles::Draft>& draft = std::nullopt);

  // A port, as atoi(3) reads it: rpc.statd(8) and rpc.mountd(8) read decimal digits and ignore what follows them.
  int Port(const char* section, const char* key, int fallback) const;

  // A switch, in the words of nfs.conf(5).
  bool Switch(const char* section, const char* key, bool fallback) const;

  // A number of the platform's own from 0, in C's notation.
  int Number(const char* section, const char* key, int fallback) const;

  // A string of the platform's own; "" if it is not set or has `size` bytes or more.
  std::string Text(const char* section, const char* key, std::size_t size) const;

  const IniFiles& files() const { return *files_; }

 private:
  NFSConfiguration(SharedIniFiles files, bool is_draft) : files_(std::move(files)), is_draft_(is_draft) {}

  // The setting in force. A reference to nothing becomes a remark.
  std::optional<IniFound> Find(const char* section, const char* key) const;

  void Remark(const IniFound& setting, const std::string& why) const;

  SharedIniFiles files_;
  bool is_draft_;
};

}  // namespace vorn

#endif  // VORN_LINUX_SETTINGS_NFS_CONFIGURATION_H

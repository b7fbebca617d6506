// A cache of the kernel's RPC server, as the files below /proc/net/rpc show it.
#ifndef VORN_LINUX_SERVICE_KERNEL_CACHE_H
#define VORN_LINUX_SERVICE_KERNEL_CACHE_H

#include <optional>
#include <string>
#include <vector>

#include "status.h"

namespace vorn {

constexpr char kKernelCaches[] = "/proc/net/rpc";

constexpr char kRightsCache[] = "nfsd.export";      // what a client may do in a directory
constexpr char kHandlesCache[] = "nfsd.fh";         // the directory that a file handle of a client means
constexpr char kAddressesCache[] = "auth.unix.ip";  // the clients of the export table that an address belongs to

// An entry expires when it is written to the file "channel" with a time that has passed. "flush" expires all entries.
class KernelCache {
 public:
  // The words of a line of "content". Unusual bytes of a word are escaped (UnescapeWord).
  struct Entry {
    std::vector<std::string> words;
    bool is_negative = false;  // the kernel remembers that there is no right, directory or client
  };

  // `folder` is that of the caches, kKernelCaches on a box.
  KernelCache(const std::string& folder, const char* name) : folder_(folder + "/" + name) {}

  // Returns the entries; nullopt if they cannot be read.
  std::optional<std::vector<Entry>> Entries() const;

  // Writes each line to the channel in one write(2). A line whose entry has gone meanwhile is skipped. If another one
  // cannot be written, all of the cache is flushed.
  Status Write(const std::vector<std::string>& lines) const;

  // Expires all entries. Fails with the system's error.
  Status Flush() const;

 private:
  Status WriteToChannel(const std::vector<std::string>& lines) const;

  const std::string folder_;
};

// Undoes the escapes of a word of an entry: "\040" is a blank.
std::string UnescapeWord(const std::string& word);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_KERNEL_CACHE_H

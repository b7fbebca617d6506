// The counters of the kernel's NFS server.
#ifndef VORN_LINUX_SERVICE_KERNEL_STATISTICS_H
#define VORN_LINUX_SERVICE_KERNEL_STATISTICS_H

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace vorn {

constexpr char kKernelStatistics[] = "/proc/net/rpc/nfsd";

// The figures of /proc/net/rpc/nfsd. All but `threads` are counted since the module nfsd was loaded.
struct KernelStatistics {
  struct Operation {
    std::string version;  // "3" or "4"
    std::string name;     // in lower case, as in RFC 1813 and RFC 7530 to 8276: "getattr"
    std::uint64_t count = 0;
  };
  struct ReplyCache {
    std::uint64_t hits = 0;
    std::uint64_t misses = 0;
    std::uint64_t uncached = 0;  // requests that need no cache
  };

  std::uint64_t threads = 0;
  std::uint64_t bytes_read = 0;
  std::uint64_t bytes_written = 0;
  std::uint64_t calls = 0;
  std::uint64_t bad_format = 0;          // of the calls: malformed
  std::uint64_t bad_authentication = 0;  // of the calls: credentials or address not accepted
  std::uint64_t tcp_connections = 0;
  ReplyCache reply_cache;
  std::vector<Operation> operations;
};

// Reads the text of the file. Lines and numbers that a kernel does not have count as zero.
KernelStatistics ParseKernelStatistics(std::string_view text);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_KERNEL_STATISTICS_H

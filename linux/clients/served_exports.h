// The memory of the kernel's server about clients: the rule of an address, the exports in use, and refusals.
#ifndef VORN_LINUX_CLIENTS_SERVED_EXPORTS_H
#define VORN_LINUX_CLIENTS_SERVED_EXPORTS_H

#include <cstdint>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "kernel_cache.h"

namespace vorn {

constexpr char kExportStatistics[] = "/proc/fs/nfsd/export_stats";

// The bytes that the clients of a rule have transferred since the kernel last asked rpc.mountd(8) for the export.
struct ExportTraffic {
  std::uint64_t bytes_read = 0;
  std::uint64_t bytes_written = 0;
  std::int64_t begun = 0;  // in seconds of CLOCK_MONOTONIC, when the counting began
};

// By path and rule.
using ExportTraffics = std::map<std::pair<std::string, std::string>, ExportTraffic>;

// Reads the text of /proc/fs/nfsd/export_stats, which Linux has since 5.13. An incomplete entry is ignored.
ExportTraffics ParseExportTraffics(const std::string& text);

// The kernel keeps rights per rule and not per address: all clients of a rule have the same exports here. An entry goes
// half an hour after its last use. A rule is named as rpc.mountd names it: by the clients of the export table that an
// address belongs to, "client.example,10.0.0.0/24".
struct ServedExports {
  std::map<std::string, std::string> rules;               // address to rule
  std::set<std::string> refused;                          // the addresses that no rule has
  std::map<std::string, std::set<std::string>> paths;     // rule to the exports in use
  std::map<std::string, std::set<std::string>> unserved;  // rule to the paths that it does not export
};

// Reads the caches of the addresses and of the rights. The tree that leads NFSv4 clients to the exports is left out.
ServedExports ReadServedExports(const std::vector<KernelCache::Entry>& addresses,
                                const std::vector<KernelCache::Entry>& rights);

}  // namespace vorn

#endif  // VORN_LINUX_CLIENTS_SERVED_EXPORTS_H

#include "kernel_statistics.h"

#include <array>
#include <cstddef>
#include <sstream>

namespace vorn {
namespace {

// The procedures of NFSv3 by number (RFC 1813, 3.3).
constexpr std::array<const char*, 22> kProcedures3 = {
    "null",    "getattr",     "setattr", "lookup", "access",   "readlink", "read",   "write",
    "create",  "mkdir",       "symlink", "mknod",  "remove",   "rmdir",    "rename", "link",
    "readdir", "readdirplus", "fsstat",  "fsinfo", "pathconf", "commit"};

// The operations of NFSv4 by number, from 3 (RFC 7530, 16; RFC 8881, 18; RFC 7862, 15; RFC 8276, 8.4).
constexpr std::size_t kFirstOperation4 = 3;
constexpr std::array<const char*, 73> kOperations4 = {"access",
                                                      "close",
                                                      "commit",
                                                      "create",
                                                      "delegpurge",
                                                      "delegreturn",
                                                      "getattr",
                                                      "getfh",
                                                      "link",
                                                      "lock",
                                                      "lockt",
                                                      "locku",
                                                      "lookup",
                                                      "lookupp",
                                                      "nverify",
                                                      "open",
                                                      "openattr",
                                                      "open_confirm",
                                                      "open_downgrade",
                                                      "putfh",
                                                      "putpubfh",
                                                      "putrootfh",
                                                      "read",
                                                      "readdir",
                                                      "readlink",
                                                      "remove",
                                                      "rename",
                                                      "renew",
                                                      "restorefh",
                                                      "savefh",
                                                      "secinfo",
                                                      "setattr",
                                                      "setclientid",
                                                      "setclientid_confirm",
                                                      "verify",
                                                      "write",
                                                      "release_lockowner",
                                                      "backchannel_ctl",
                                                      "bind_conn_to_session",
                                                      "exchange_id",
                                                      "create_session",
                                                      "destroy_session",
                                                      "free_stateid",
                                                      "get_dir_delegation",
                                                      "getdeviceinfo",
                                                      "getdevicelist",
                                                      "layoutcommit",
                                                      "layoutget",
                                                      "layoutreturn",
                                                      "secinfo_no_name",
                                                      "sequence",
                                                      "set_ssv",
                                                      "test_stateid",
                                                      "want_delegation",
                                                      "destroy_clientid",
                                                      "reclaim_complete",
                                                      "allocate",
                                                      "copy",
                                                      "copy_notify",
                                                      "deallocate",
                                                      "io_advise",
                                                      "layouterror",
                                                      "layoutstats",
                                                      "offload_cancel",
                                                      "offload_status",
                                                      "read_plus",
                                                      "seek",
                                                      "write_same",
                                                      "clone",
                                                      "getxattr",
                                                      "setxattr",
                                                      "listxattrs",
                                                      "removexattr"};

using Numbers = std::vector<std::uint64_t>;

Numbers NumbersOf(std::istringstream* line) {
  Numbers numbers;
  for (std::uint64_t number = 0; *line >> number;) numbers.push_back(number);
  return numbers;
}

std::uint64_t At(const Numbers& numbers, std::size_t index) { return index < numbers.size() ? numbers[index] : 0; }

// `numbers` begins with their number, then follow the counts by procedure; `first` is that of the first name.
template <std::size_t kSize>
void AddOperations(const char* version, const std::array<const char*, kSize>& names, std::size_t first,
                   const Numbers& numbers, std::vector<KernelStatistics::Operation>* operations) {
  for (std::size_t i = 0; i < names.size() && first + i + 1 < numbers.size(); ++i) {
    operations->push_back({version, names[i], numbers[first + i + 1]});
  }
}

void ReadLine(const std::string& name, const Numbers& numbers, KernelStatistics* statistics) {
  if (name == "rc") statistics->reply_cache = {At(numbers, 0), At(numbers, 1), At(numbers, 2)};
  if (name == "io") {
    statistics->bytes_read = At(numbers, 0);
    statistics->bytes_written = At(numbers, 1);
  }
  if (name == "th") statistics->threads = At(numbers, 0);
  if (name == "net") statistics->tcp_connections = At(numbers, 3);
  if (name == "rpc") {
    statistics->calls = At(numbers, 0);
    statistics->bad_format = At(numbers, 2);
    statistics->bad_authentication = At(numbers, 3);
  }
  if (name == "proc3") AddOperations("3", kProcedures3, 0, numbers, &statistics->operations);
  if (name == "proc4ops") AddOperations("4", kOperations4, kFirstOperation4, numbers, &statistics->operations);
}

}  // namespace

KernelStatistics ParseKernelStatistics(std::string_view text) {
  KernelStatistics statistics;
  std::istringstream lines{std::string(text)};
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string name;
    words >> name;
    ReadLine(name, NumbersOf(&words), &statistics);
  }
  return statistics;
}

}  // namespace vorn

#include "kernel_exports.h"

#include <sys/stat.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <functional>
#include <optional>
#include <utility>
#include <vector>

#include "exports_client.h"
#include "folder_path.h"
#include "kernel_cache.h"

namespace vorn {
namespace {

// Returns the line to write to the channel in order to expire the entry; nullopt for an entry that stays.
using Expire = std::function<std::optional<std::string>(const KernelCache::Entry& entry)>;

// Returns the lines that expire entries of the cache; nullopt if the entries cannot be read.
std::optional<std::vector<std::string>> LinesToExpire(const KernelCache& cache, const Expire& expire) {
  const auto entries = cache.Entries();
  if (!entries) return std::nullopt;
  std::vector<std::string> lines;
  for (const KernelCache::Entry& entry : *entries) {
    if (auto line = expire(entry)) lines.push_back(std::move(*line));
  }
  return lines;
}

Status ExpireEntries(const KernelCache& cache, const Expire& expire) {
  const auto lines = LinesToExpire(cache, expire);
  return lines ? cache.Write(*lines) : cache.Flush();
}

// In seconds since the epoch.
std::string Past() { return std::to_string(std::time(nullptr) - 1); }

std::optional<dev_t> DeviceOf(const std::string& path) {
  struct stat stat {};
  if (lstat(path.c_str(), &stat) != 0) return std::nullopt;
  return stat.st_dev;
}

bool IsVolume(const std::string& path) {
  const auto device = DeviceOf(path);
  return device && device != DeviceOf(path.substr(0, path.rfind('/') + 1));
}

bool IsOneOrAboveOne(const std::string& path, const std::set<std::string>& directories) {
  if (directories.count(path) != 0) return true;
  const auto next = directories.lower_bound(path == "/" ? path : path + "/");
  return next != directories.end() && IsBelow(*next, path);
}

bool IsBelowOne(const std::string& path, const std::set<std::string>& directories) {
  for (std::size_t slash = path.rfind('/'); slash != std::string::npos && slash > 0;
       slash = path.rfind('/', slash - 1)) {
    if (directories.count(path.substr(0, slash)) != 0) return true;
  }
  return directories.count("/") != 0;
}

// Whether rights in `path` may depend on the exports of a changed directory: it may be below it on another volume
// (crossmnt), or above it in the tree that NFSv4 clients see.
bool IsConcerned(const std::string& path, const std::set<std::string>& changed) {
  return IsOneOrAboveOne(path, changed) || IsBelowOne(path, changed);
}

// Whether the kernel has rights in `path` although the table gives none there: the directory was moved, and the kernel
// follows it.
bool HasMoved(const std::string& path, const std::set<std::string>& exported) {
  return !IsOneOrAboveOne(path, exported) && !(IsBelowOne(path, exported) && IsVolume(path));
}

// "/srv/data client(rw,...)"
Status ForgetRights(const KernelCache& cache, const ExportTableUpdate& update, const RightsWriter& write) {
  const auto lines = LinesToExpire(cache, [&update](const KernelCache::Entry& entry) -> std::optional<std::string> {
    const auto& words = entry.words;
    if (words.size() < 2) return std::nullopt;
    const std::string path = UnescapeWord(words[0]);
    if (!IsConcerned(path, update.changed) && (entry.is_negative || !HasMoved(path, update.exported))) {
      return std::nullopt;
    }
    return words[1].substr(0, words[1].rfind('(')) + " " + words[0] + " " + Past();
  });
  if (!lines) return cache.Flush();
  std::string text;
  for (const std::string& line : *lines) text += line + "\n";
  return text.empty() || write(text).ok() ? Status() : cache.Flush();
}

// The bytes of "0x01020304...", which shows words of 32 bits, as the channel takes them: "\x04030201..." on a
// little-endian machine.
std::string HandleBytes(const std::string& shown) {
  std::string bytes = "\\x";
  for (std::size_t at = 2; at + 8 <= shown.size(); at += 8) {
    const auto word = static_cast<std::uint32_t>(std::stoul(shown.substr(at, 8), nullptr, 16));
    unsigned char raw[sizeof word];
    std::memcpy(raw, &word, sizeof word);
    for (const unsigned char byte : raw) {
      constexpr char kDigits[] = "0123456789abcdef";
      bytes.push_back(kDigits[byte >> 4]);
      bytes.push_back(kDigits[byte & 15]);
    }
  }
  return bytes;
}

// "client 6 0x01020304... /srv/data". A handle that had no directory may have one now.
Status ForgetHandles(const KernelCache& cache, const ExportTableUpdate& update) {
  return ExpireEntries(cache, [&update](const KernelCache::Entry& entry) -> std::optional<std::string> {
    const auto& words = entry.words;
    if (words.size() < 3 || words[2].substr(0, 2) != "0x") return std::nullopt;
    const bool has_directory = !entry.is_negative && words.size() > 3;
    if (has_directory) {
      const std::string path = UnescapeWord(words[3]);
      if (!IsConcerned(path, update.left) && !HasMoved(path, update.exported)) return std::nullopt;
    }
    return words[0] + " " + words[1] + " " + HandleBytes(words[2]) + " " + Past();
  });
}

// Whether only the address `client` itself belongs to the client.
bool IsOneAddress(const std::string& client) {
  return !IsExportHostName(client) && client.find_first_of("*?[@/") == std::string::npos;
}

// "nfsd 10.0.0.1 client,client"
Status ForgetAddresses(const KernelCache& cache, const std::set<std::string>& clients) {
  if (clients.empty()) return {};
  std::set<std::string> addresses;
  for (const std::string& client : clients) addresses.insert(ExportClientKey(client));
  const bool all = !std::all_of(clients.begin(), clients.end(), IsOneAddress);
  return ExpireEntries(cache, [&](const KernelCache::Entry& entry) -> std::optional<std::string> {
    const auto& words = entry.words;
    if (words.size() < 2 || words[0] != "nfsd") return std::nullopt;
    if (!all && addresses.count(ExportClientKey(words[1])) == 0) return std::nullopt;
    return words[0] + " " + words[1] + " " + Past();
  });
}

// Whether a directory that is not exported any more is on a file system without another export.
bool HasLeftVolume(const ExportTableUpdate& update) {
  std::set<dev_t> left;
  for (const std::string& path : update.left) {
    const auto device = DeviceOf(path);
    if (!device) return true;
    left.insert(*device);
  }
  for (auto path = update.exported.begin(); path != update.exported.end() && !left.empty(); ++path) {
    if (const auto device = DeviceOf(*path)) left.erase(*device);
  }
  return !left.empty();
}

}  // namespace

Status ForgetExports(const std::string& folder, const ExportTableUpdate& update, const RightsWriter& write_rights) {
  if (update.changed.empty()) return {};
  const KernelCache rights(folder, kRightsCache);
  const Status addresses = ForgetAddresses(KernelCache(folder, kAddressesCache), update.clients);
  const Status handles = ForgetHandles(KernelCache(folder, kHandlesCache), update);
  const Status forgotten = HasLeftVolume(update) ? rights.Flush() : ForgetRights(rights, update, write_rights);
  return !addresses.ok() ? addresses : !handles.ok() ? handles : forgotten;
}

Status ForgetClients(const std::string& folder) { return KernelCache(folder, kAddressesCache).Flush(); }

}  // namespace vorn

#include "kernel_exports.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <fstream>
#include <functional>
#include <optional>
#include <sstream>
#include <utility>
#include <vector>

#include "exports_client.h"
#include "exports_text.h"
#include "file_descriptor.h"
#include "files.h"

namespace vorn {
namespace {

constexpr char kRights[] = "nfsd.export";      // what a client may do in a directory
constexpr char kHandles[] = "nfsd.fh";         // the directory that a file handle of a client means
constexpr char kAddresses[] = "auth.unix.ip";  // the clients of the table that an address belongs to

using Words = std::vector<std::string>;

// Returns the line to write to the channel in order to expire the entry; nullopt for an entry that stays.
using Expire = std::function<std::optional<std::string>(const Words& entry, bool is_negative)>;

// One of the caches. Its `content` has one entry per line; "# " precedes an entry without a right.
class Cache {
 public:
  Cache(const std::string& folder, const char* name) : folder_(folder + "/" + name) {}

  Status Flush() const { return WriteLine("flush", std::to_string(std::time(nullptr))); }

  // Returns the lines that expire entries; nullopt if the entries cannot be read.
  std::optional<std::vector<std::string>> Expired(const Expire& expire) const {
    std::ifstream content(folder_ + "/content");
    if (!content) return std::nullopt;
    std::vector<std::string> lines;
    for (std::string line; std::getline(content, line);) {
      const bool is_negative = line.substr(0, 2) == "# ";
      std::istringstream text(is_negative ? line.substr(2) : line);
      Words words;
      for (std::string word; text >> word;) words.push_back(word);
      if (words.empty() || words[0][0] == '#') continue;  // the header
      if (const auto entry = expire(words, is_negative)) lines.push_back(*entry);
    }
    return lines;
  }

  Status ExpireEntries(const Expire& expire) const {
    const auto lines = Expired(expire);
    if (!lines) return Flush();
    for (const std::string& line : *lines) {
      // The entry may have gone meanwhile.
      if (const Status status = WriteLine("channel", line); !status.ok() && status.code() != ENOENT) return Flush();
    }
    return {};
  }

 private:
  Status WriteLine(const char* file, const std::string& line) const {
    const std::string path = folder_ + "/" + file;
    const FileDescriptor channel(open(path.c_str(), O_WRONLY | O_APPEND | O_CLOEXEC));
    return channel ? WriteAll(channel.get(), line + "\n", path) : Status::System(errno, path);
  }

  const std::string folder_;
};

// In seconds since the epoch.
std::string Past() { return std::to_string(std::time(nullptr) - 1); }

bool IsBelow(const std::string& path, const std::string& folder) {
  return folder == "/" ||
         (path.size() > folder.size() && path[folder.size()] == '/' && path.compare(0, folder.size(), folder) == 0);
}

// Whether rights in `path` may depend on the exports of a changed directory: it may be below it on another volume
// (crossmnt), or above it in the tree that NFSv4 clients see.
bool IsConcerned(const std::string& path, const std::set<std::string>& changed) {
  if (changed.count(path) != 0) return true;
  const auto next = changed.lower_bound(path == "/" ? path : path + "/");
  if (next != changed.end() && IsBelow(*next, path)) return true;
  for (std::size_t slash = path.rfind('/'); slash != std::string::npos && slash > 0;
       slash = path.rfind('/', slash - 1)) {
    if (changed.count(path.substr(0, slash)) != 0) return true;
  }
  return changed.count("/") != 0;
}

// Undoes the escapes of a path in a cache's content, "\040".
std::string Unescape(const std::string& word) {
  std::string text;
  for (std::size_t i = 0; i < word.size(); ++i) {
    if (word[i] == '\\' && i + 3 < word.size()) {
      text.push_back(static_cast<char>(std::stoi(word.substr(i + 1, 3), nullptr, 8)));
      i += 3;
    } else {
      text.push_back(word[i]);
    }
  }
  return text;
}

// "/srv/data client(rw,...)"
Status ForgetRights(const Cache& cache, const std::set<std::string>& changed, const RightsWriter& write) {
  const auto lines = cache.Expired([&changed](const Words& entry, bool) -> std::optional<std::string> {
    if (entry.size() < 2 || !IsConcerned(Unescape(entry[0]), changed)) return std::nullopt;
    return entry[1].substr(0, entry[1].rfind('(')) + " " + entry[0] + " " + Past();
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
Status ForgetHandles(const Cache& cache, const ExportTableUpdate& update) {
  return cache.ExpireEntries([&update](const Words& entry, bool is_negative) -> std::optional<std::string> {
    if (entry.size() < 3 || entry[2].substr(0, 2) != "0x") return std::nullopt;
    const bool concerned = is_negative || entry.size() < 4 || IsConcerned(Unescape(entry[3]), update.left);
    if (!concerned) return std::nullopt;
    return entry[0] + " " + entry[1] + " " + HandleBytes(entry[2]) + " " + Past();
  });
}

// Whether only the address `client` itself belongs to the client.
bool IsOneAddress(const std::string& client) {
  return !IsExportHostName(client) && client.find_first_of("*?[@/") == std::string::npos;
}

// "nfsd 10.0.0.1 client,client"
Status ForgetAddresses(const Cache& cache, const std::set<std::string>& clients) {
  if (clients.empty()) return {};
  std::set<std::string> addresses;
  for (const std::string& client : clients) addresses.insert(ExportClientKey(client));
  const bool all = !std::all_of(clients.begin(), clients.end(), IsOneAddress);
  return cache.ExpireEntries([&](const Words& entry, bool /*is_negative*/) -> std::optional<std::string> {
    if (entry.size() < 2 || entry[0] != "nfsd") return std::nullopt;
    if (!all && addresses.count(ExportClientKey(entry[1])) == 0) return std::nullopt;
    return entry[0] + " " + entry[1] + " " + Past();
  });
}

std::optional<dev_t> DeviceOf(const std::string& path) {
  struct stat stat {};
  if (lstat(path.c_str(), &stat) != 0) return std::nullopt;
  return stat.st_dev;
}

// Whether a directory that is not exported any more is on a file system without another export.
bool HasLeftVolume(const ExportTableUpdate& update) {
  std::set<dev_t> left;
  for (const std::string& path : update.left) {
    const auto device = DeviceOf(path);
    if (!device) return true;
    left.insert(*device);
  }
  for (std::size_t begin = 0; begin < update.text.size() && !left.empty();) {
    const std::size_t end = std::min(update.text.find('\n', begin), update.text.size());
    const auto device = DeviceOf(Unescape(update.text.substr(begin, update.text.find('\t', begin) - begin)));
    if (device) left.erase(*device);
    begin = end + 1;
  }
  return !left.empty();
}

}  // namespace

Status ForgetExports(const std::string& folder, const ExportTableUpdate& update, const RightsWriter& write_rights) {
  if (update.changed.empty()) return {};
  const Cache rights(folder, kRights);
  const Status addresses = ForgetAddresses(Cache(folder, kAddresses), update.clients);
  const Status handles = ForgetHandles(Cache(folder, kHandles), update);
  const Status forgotten = HasLeftVolume(update) ? rights.Flush() : ForgetRights(rights, update.changed, write_rights);
  return !addresses.ok() ? addresses : !handles.ok() ? handles : forgotten;
}

Status ForgetClients(const std::string& folder) { return Cache(folder, kAddresses).Flush(); }

}  // namespace vorn

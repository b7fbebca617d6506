#include "folder_permissions.h"

#include <endian.h>
#include <sys/stat.h>
#include <sys/xattr.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

namespace vorn {
namespace {

constexpr char kACL[] = "system.posix_acl_access";

// An access control list as <linux/posix_acl_xattr.h> lays it out, in little-endian order.
enum class Tag : std::uint16_t {
  kOwner = 0x01,
  kUser = 0x02,
  kOwnerGroup = 0x04,
  kGroup = 0x08,
  kMask = 0x10,
  kOther = 0x20
};

struct Entry {
  Tag tag;
  unsigned permissions;
  std::uint32_t id;
};

std::vector<Entry> ReadEntries(const std::string& acl) {
  constexpr std::size_t kHeader = 4;
  constexpr std::size_t kSize = 8;
  std::vector<Entry> entries;
  for (std::size_t at = kHeader; at + kSize <= acl.size(); at += kSize) {
    std::uint16_t tag = 0;
    std::uint16_t permissions = 0;
    std::uint32_t id = 0;
    std::memcpy(&tag, acl.data() + at, sizeof tag);
    std::memcpy(&permissions, acl.data() + at + 2, sizeof permissions);
    std::memcpy(&id, acl.data() + at + 4, sizeof id);
    entries.push_back({static_cast<Tag>(le16toh(tag)), le16toh(permissions), le32toh(id)});
  }
  return entries;
}

// The permission bits without a list, as one.
std::vector<Entry> EntriesOf(const FolderPermissions& folder) {
  if (!folder.acl.empty()) return ReadEntries(folder.acl);
  return {{Tag::kOwner, folder.mode >> 6 & 7, 0},
          {Tag::kOwnerGroup, folder.mode >> 3 & 7, 0},
          {Tag::kOther, folder.mode & 7, 0}};
}

bool IsIn(const VORN::AccessIdentity& identity, std::uint32_t group) {
  return identity.group_id == group ||
         std::find(identity.groups.begin(), identity.groups.end(), group) != identity.groups.end();
}

// The algorithm of acl(5).
unsigned PermissionsOf(const FolderPermissions& folder, const VORN::AccessIdentity& identity, unsigned wanted) {
  const std::vector<Entry> entries = EntriesOf(folder);
  unsigned mask = 7;
  unsigned other = 0;
  for (const Entry& entry : entries) {
    if (entry.tag == Tag::kOwner && identity.user_id == folder.owner) return entry.permissions & wanted;
    if (entry.tag == Tag::kMask) mask = entry.permissions;
    if (entry.tag == Tag::kOther) other = entry.permissions;
  }
  for (const Entry& entry : entries) {
    if (entry.tag == Tag::kUser && identity.user_id == entry.id) return entry.permissions & mask & wanted;
  }
  bool is_in_group = false;
  unsigned best = 0;
  for (const Entry& entry : entries) {
    const bool is_group = (entry.tag == Tag::kOwnerGroup && IsIn(identity, folder.group)) ||
                          (entry.tag == Tag::kGroup && IsIn(identity, entry.id));
    if (!is_group) continue;
    is_in_group = true;
    const unsigned allowed = entry.permissions & mask & wanted;
    if (allowed == wanted) return allowed;  // one entry must have all of them
    best = std::max(best, allowed);
  }
  return is_in_group ? best : other & wanted;
}

std::string ReadACL(const std::string& location) {
  std::array<char, 4096> value{};
  const ssize_t size = getxattr(location.c_str(), kACL, value.data(), value.size());
  return size > 0 ? std::string(value.data(), static_cast<std::size_t>(size)) : std::string();
}

}  // namespace

unsigned FolderPermissions::Of(const VORN::AccessIdentity& identity, unsigned wanted) const {
  return identity.user_id == 0 ? wanted : PermissionsOf(*this, identity, wanted);
}

Result<FolderPermissions> ReadFolderPermissions(Box& box, const std::string& path) {
  const Result<std::string> location = box.root().Locate(path);
  if (!location.ok()) return location.status();
  struct stat stat {};
  if (::stat(location->c_str(), &stat) != 0) return Status::System(errno, *location);
  return FolderPermissions{stat.st_uid, stat.st_gid, stat.st_mode & 0777, ReadACL(*location)};
}

}  // namespace vorn

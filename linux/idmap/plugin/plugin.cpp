// The translation method "vorn" of libnfsidmap: the static mappings of idmapd.conf(5), from a table that is compiled
// whenever they change.
#include <grp.h>
#include <pwd.h>

#include <cerrno>
#include <cstring>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "mapping_file.h"

extern "C" {
// These headers lack their own includes, and declare nothing for C++.
#include <nfsidmap.h>
#include <nfsidmap_plugin.h>
#include <sys/types.h>
}

namespace vorn {
namespace {

// The path of the table. The setting exists for trials; a box has the table at its usual path.
std::string TablePath() {
  const char* path = nfsidmap_config_get("vorn", "Mappings");
  return path == nullptr ? kMappingTableFile : path;
}

MappingFile& Table() {
  static MappingFile table(TablePath());
  return table;
}

struct User {
  std::string name;
  uid_t user_id;
  gid_t group_id;
};

// Returns 0 and the account, or errno(3) from the sources of nsswitch.conf(5). A missing account is EACCES: ENOENT
// would make libnfsidmap ask the next method, which may know a user of the principal's own name.
int FindUser(const std::string& name, std::optional<User>* user) {
  std::vector<char> buffer(1024);
  passwd account{};
  passwd* found = nullptr;
  int error = 0;
  while ((error = getpwnam_r(name.c_str(), &account, buffer.data(), buffer.size(), &found)) == ERANGE) {
    buffer.resize(buffer.size() * 2);
  }
  if (found != nullptr) {
    *user = User{found->pw_name, found->pw_uid, found->pw_gid};
    return 0;
  }
  return error == 0 || error == ENOENT || error == ESRCH ? EACCES : error;
}

// Returns 0 and the local name, or ENOENT if the principal is not mapped, or another errno(3).
int FindLocalName(const char* principal, std::string* local_name) {
  int error = 0;
  const MappingTable* table = Table().Current(&error);
  if (error != 0) {
    IDMAP_LOG(0, ("vorn: %s cannot be read: %s; nobody is mapped", TablePath().c_str(), std::strerror(error)));
    return EIO;
  }
  std::optional<std::string_view> name;
  if (table != nullptr) {
    name = table->Find(principal);
  } else if (const char* parsed = nfsidmap_config_get("Static", principal)) {
    name = parsed;  // libnfsidmap parsed it when the daemon started
  }
  if (!name) return ENOENT;
  *local_name = *name;
  return 0;
}

int FindMappedUser(const char* mechanism, const char* principal, std::optional<User>* user) {
  if (std::strcmp(mechanism, "krb5") != 0 && std::strcmp(mechanism, "spkm3") != 0) return EINVAL;
  std::string local_name;
  if (const int error = FindLocalName(principal, &local_name); error != 0) return error;
  const int error = FindUser(local_name, user);
  if (error == EACCES) {
    IDMAP_LOG(
        0, ("vorn: %s is mapped to the user %s, who does not exist; access is refused", principal, local_name.c_str()));
  }
  return error;
}

int ToIds(char* mechanism, char* principal, uid_t* user_id, gid_t* group_id, extra_mapping_params** /*extra*/) {
  try {
    std::optional<User> user;
    if (const int error = FindMappedUser(mechanism, principal, &user); error != 0) return -error;
    *user_id = user->user_id;
    *group_id = user->group_id;
    return 0;
  } catch (const std::bad_alloc&) {
    return -ENOMEM;
  }
}

// `*count` is the room in `groups`, and afterwards the number of groups, also if there is not enough room (-ERANGE).
int ToGroups(char* mechanism, char* principal, gid_t* groups, int* count, extra_mapping_params** /*extra*/) {
  try {
    std::optional<User> user;
    if (const int error = FindMappedUser(mechanism, principal, &user); error != 0) return -error;
    return getgrouplist(user->name.c_str(), user->group_id, groups, count) < 0 ? -ERANGE : 0;
  } catch (const std::bad_alloc&) {
    return -ENOMEM;
  }
}

// Reads the table before the daemon's first question, so that it stays in force if its file disappears. A failure is
// reported by the first question: libnfsidmap would refuse every method if this function failed.
int Start() {
  try {
    int error = 0;
    Table().Current(&error);
  } catch (const std::bad_alloc&) {
  }
  return 0;
}

char g_name[] = "vorn";

// libnfsidmap asks a method only for what it offers. Names of NFSv4 attributes are left to the other methods.
trans_func g_functions = {g_name, Start, ToIds, nullptr, nullptr, nullptr, nullptr, ToGroups};

}  // namespace
}  // namespace vorn

// Called by libnfsidmap when it has loaded the plug-in.
extern "C" __attribute__((visibility("default"))) trans_func* libnfsidmap_plugin_init() { return &vorn::g_functions; }

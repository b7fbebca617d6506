#include "users.h"

#include <grp.h>
#include <pwd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <iterator>
#include <sstream>
#include <utility>

#include "owned.h"

namespace vorn {
namespace {

Result<Accounts> ParseAccounts(StoredFile file) {
  Accounts accounts;
  if (file.text.empty()) return accounts;
  const Owned<std::FILE, std::fclose> stream(fmemopen(file.text.data(), file.text.size(), "r"));
  if (stream == nullptr) return Status::System(errno, file.location);
  std::vector<char> line(file.text.size() + 2);  // fgetpwent_r needs more than the longest line and a NUL byte
  passwd account{};
  passwd* found = nullptr;
  while (fgetpwent_r(stream.get(), &account, line.data(), line.size(), &found) == 0) {
    accounts.push_back({account.pw_name, account.pw_uid, account.pw_gid});
  }
  return accounts;
}

Result<Groups> ParseGroups(StoredFile file) {
  Groups groups;
  if (file.text.empty()) return groups;
  const Owned<std::FILE, std::fclose> stream(fmemopen(file.text.data(), file.text.size(), "r"));
  if (stream == nullptr) return Status::System(errno, file.location);
  // fgetgrent_r also puts the list of members there, a pointer for at most each second byte of the line.
  std::vector<char> line((file.text.size() + 2) * sizeof(char*));
  group entry{};
  group* found = nullptr;
  while (fgetgrent_r(stream.get(), &entry, line.data(), line.size(), &found) == 0) {
    Group one{entry.gr_name, entry.gr_gid, {}};
    for (char** member = entry.gr_mem; *member != nullptr; ++member) one.members.emplace_back(*member);
    groups.push_back(std::move(one));
  }
  return groups;
}

// The user ids of people: login.defs(5).
struct UserIds {
  unsigned long smallest = 1000;
  unsigned long largest = 60000;
};

Result<UserIds> ParseUserIds(const StoredFile& file) {
  UserIds ids;
  std::istringstream lines(file.text);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string name;
    unsigned long number = 0;
    if (!(words >> name >> number)) continue;
    if (name == "UID_MIN") ids.smallest = number;
    if (name == "UID_MAX") ids.largest = number;
  }
  return ids;
}

}  // namespace

Result<std::shared_ptr<const Accounts>> ReadAccounts(Box& box) {
  return box.Load<Accounts>("/etc/passwd", ParseAccounts);
}

Result<std::shared_ptr<const Groups>> ReadGroups(Box& box) { return box.Load<Groups>("/etc/group", ParseGroups); }

Result<Accounts> ReadLocalUsers(Box& box) {
  const auto accounts = ReadAccounts(box);
  if (!accounts.ok()) return accounts.status();
  const auto ids = box.Load<UserIds>("/etc/login.defs", ParseUserIds);
  if (!ids.ok()) return ids.status();
  Accounts users;
  std::copy_if((*accounts)->begin(), (*accounts)->end(), std::back_inserter(users), [&](const Account& account) {
    return account.user_id >= (*ids)->smallest && account.user_id <= (*ids)->largest;
  });
  return users;
}

std::optional<Account> FindAccount(const Accounts& accounts, const std::string& name) {
  const auto found =
      std::find_if(accounts.begin(), accounts.end(), [&](const Account& account) { return account.name == name; });
  return found == accounts.end() ? std::nullopt : std::optional<Account>(*found);
}

}  // namespace vorn

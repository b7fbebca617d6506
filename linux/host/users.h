// The accounts of a box: its passwd(5).
#ifndef VORN_LINUX_HOST_USERS_H
#define VORN_LINUX_HOST_USERS_H

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

struct Account {
  std::string name;
  unsigned user_id = 0;
  unsigned group_id = 0;
};

// Every account, in the order of the file. Lines that are not accounts are skipped, as by the C library.
using Accounts = std::vector<Account>;

// The accounts of the box, shared by all who read the same version of the file.
Result<std::shared_ptr<const Accounts>> ReadAccounts(Box& box);

// The accounts of people: their user ids are from UID_MIN to UID_MAX of login.defs(5).
Result<Accounts> ReadLocalUsers(Box& box);

struct Group {
  std::string name;
  unsigned group_id = 0;
  std::vector<std::string> members;  // names of accounts; those whose own group it is are mostly not among them
};

// Every group of group(5), in the order of the file.
using Groups = std::vector<Group>;

// The groups of the box, shared by all who read the same version of the file.
Result<std::shared_ptr<const Groups>> ReadGroups(Box& box);

// The account of this name; nullopt if there is none.
std::optional<Account> FindAccount(const Accounts& accounts, const std::string& name);

}  // namespace vorn

#endif  // VORN_LINUX_HOST_USERS_H

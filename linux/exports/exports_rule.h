// An export rule (nfsconf.h) and an entry of the exports file, one made from the other.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_RULE_H
#define VORN_LINUX_EXPORTS_EXPORTS_RULE_H

#include <optional>

#include "box.h"
#include "exports_document.h"
#include "nfsconf.h"
#include "status.h"

namespace vorn {

// The numeric ids of an account.
struct AccountIDs {
  int user = 0;
  int group = 0;
};

// The accounts of the squash modes; none, where the box has no account of that name.
struct SquashAccounts {
  std::optional<AccountIDs> admin;
  std::optional<AccountIDs> guest;

  // The accounts that the settings of the box name, from its passwd(5).
  static Result<SquashAccounts> Load(Box& box);
};

// What the rule record can say of an entry. Where it has one field for what security flavours may do
// differently, that holds the most that one of them may do, so that no access goes unseen. The squash
// modes have no word for squashing to a third account: all users, it reads as ALL_ADMIN, root as GUEST.
ExportRule RuleOf(const ExportEntry& entry, const SquashAccounts& accounts);

// The entry for a rule. `present` is the file's entry of the same client, or null: what the rule does
// not say, and what it says as before, stays as it is there. Fails with kRefusedText for a rule that
// exports(5) cannot carry.
Result<ExportEntry> EntryOf(const ExportRule& rule, const ExportEntry* present, const SquashAccounts& accounts);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_RULE_H

// Conversion between export rules (nfsconf.h) and entries of an exports(5) file.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_RULE_H
#define VORN_LINUX_EXPORTS_EXPORTS_RULE_H

#include <optional>
#include <string>

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

// The accounts of the squash modes; nullopt if the box has no account of that name.
struct SquashAccounts {
  std::optional<AccountIDs> admin;
  std::optional<AccountIDs> guest;
  std::string admin_name = "admin";  // in the settings
  std::string guest_name = "nobody";

  // Looks up the accounts that the settings of the box name in its passwd(5).
  static Result<SquashAccounts> Load(Box& box);
};

// Returns the rule that shows an entry. The record has one field for privilege, squash mode and insecure ports,
// but the security flavours of an entry may differ in them. The field then shows the widest access that any
// flavour has, so that no access is hidden. The squash modes know two accounts. Squashing to another account
// reads as ALL_ADMIN if it concerns all users, else as GUEST.
ExportRule RuleOf(const ExportEntry& entry, const SquashAccounts& accounts);

// Returns the entry of a rule. `present` is the entry that the file has for the client, or null.
//
// A field that differs from RuleOf(*present) is changed for every flavour. Everything else stays as it is in
// `present`, flavour by flavour, so a change of one field never widens another access. A flavour that is added
// gets the access that all present flavours have.
//
// Fails with kRefusedText for a rule that exports(5) cannot carry, and where flavours differ so that the record
// cannot express the change: a new squash mode while they are squashed differently, a new flavour while the
// present ones differ, or a result that would not read back as `rule`.
Result<ExportEntry> EntryOf(const ExportRule& rule, const ExportEntry* present, const SquashAccounts& accounts);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_RULE_H

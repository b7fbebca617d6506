// How a change of exports(5) files changes the rights of the clients that they name.
#ifndef VORN_LINUX_EXPORTS_RULE_CHANGES_H
#define VORN_LINUX_EXPORTS_RULE_CHANGES_H

#include <string>
#include <vector>

#include "export_paths.h"
#include "exports_document.h"
#include "exports_options.h"

namespace vorn {

// One right that a client gains or loses.
struct RightChange {
  enum class Access { kLess, kMore, kOther };

  std::string change;  // "read_only"
  Access access = Access::kOther;
  std::string flavor;  // "krb5"; empty if it concerns all flavours
  std::string text;    // "becomes read-only"
};

// The changes of one client of one directory.
struct RuleChange {
  std::string directory;
  std::string client;
  std::vector<RightChange> rights;  // never empty
};

// Compares the options that a client has in an export; nullptr: no rule admits it.
std::vector<RightChange> CompareRights(const ExportOptions* before, const ExportOptions* after);

// The names of all changes that RightChange::change can have.
std::vector<std::string> AllRightChanges();

// Compares the rules of each directory that a changed line of the file names. `before` and `after` are two versions of
// the same file, and `others` the files that exportfs(8) reads after it. Of several rules of one client only the first
// one counts. Clients are compared as they are written: whether an address that loses one rule is covered by another
// one is not considered.
std::vector<RuleChange> CompareRules(const ExportsDocument& before, const ExportsDocument& after,
                                     const std::vector<const ExportsDocument*>& others, const ExportPaths& paths);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_RULE_CHANGES_H

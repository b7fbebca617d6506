// The export rules of one share: exports(5), one line per share in /etc/exports.
#ifndef VORN_LINUX_EXPORTS_SHARE_RULES_H
#define VORN_LINUX_EXPORTS_SHARE_RULES_H

#include <string>
#include <vector>

#include "box.h"
#include "nfsconf.h"
#include "status.h"

namespace vorn {

// The rules of the share at `path`, from all its lines of the exports file `file`, in file order. The records
// are not linked to each other.
Result<std::vector<ExportRule>> ReadShareRules(Box& box, const std::string& file, const std::string& path);

// Replaces every rule of the share at `path` by those of `list`, or removes them if it is null. Fails with
// kRefusedText, and writes nothing, for a rule that exports(5) cannot represent.
//
// A fault in another line of the file does not keep a rule from being written: exportfs(8) ignores what
// follows the fault with or without the new line, and one administrator's slip must not keep all others
// from closing an export. The reload that follows finds the table incomplete and names the faulty line.
Status WriteShareRules(Box& box, const std::string& path, const ExportRuleList* list);

// The version of the exports file, to be taken before a reload.
Result<Version> ReadExportsVersion(Box& box);

// Compares the export table that exportfs(8) wrote (/var/lib/nfs/etab) with the exports file after a reload:
// exportfs reports success even if it stopped half-way. Fails with kServiceFailed and a sentence that names the
// line of the file and what is wrong with it. Succeeds if the file is no longer in the state `reloaded`: the
// writer that changed it reloads again.
Status CheckExportTable(Box& box, const Version& reloaded);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_SHARE_RULES_H

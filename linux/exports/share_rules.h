// The export rules of one share, from all files of exports(5). Only /etc/exports is written, one line per share.
#ifndef VORN_LINUX_EXPORTS_SHARE_RULES_H
#define VORN_LINUX_EXPORTS_SHARE_RULES_H

#include <string>
#include <vector>

#include "box.h"
#include "exports_files.h"
#include "nfsconf.h"
#include "status.h"

namespace vorn {

// Returns the rules of the share at `path` from all its lines, in the order of the files. If `file` is
// /etc/exports, the files of /etc/exports.d count as well, as for exportfs(8). Lines are found by the directory
// that their path leads to. The records are not linked to each other.
Result<std::vector<ExportRule>> ReadShareRules(Box& box, const std::string& file, const std::string& path);

// Replaces every rule of the share at `path` by those of `list`, or removes them if it is null. Fails with
// kRefusedText and writes nothing
//  - for a rule that exports(5) cannot represent (see EntryOf);
//  - if a rule of a file in /etc/exports.d is changed or missing in `list`; an unchanged one stays in that file;
//  - if a line of the share has a fault, so that its meaning is not known; the reason has file, line and column.
//    All rules can be removed nevertheless.
//
// A fault in a line of another share does not keep a rule from being written: exportfs(8) ignores what follows the
// fault with or without the new line, and one administrator's slip must not keep all others from closing an export.
// FindExportFaults names such lines.
Status WriteShareRules(Box& box, const std::string& path, const ExportRuleList* list);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_SHARE_RULES_H

// Checks of the files of exports(5): what they export, and whether it is in force.
#ifndef VORN_LINUX_HEALTH_EXPORT_FINDINGS_H
#define VORN_LINUX_HEALTH_EXPORT_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// Each function adds what it finds, and fails with the reason if it could not check everything.

// Directories whose rules in the files are not those that the running service has.
Status FindExportsNotInForce(const HealthInput& input, Findings* findings);

// Lines that exportfs(8) does not understand, and the lines that it does not reach because of them.
Status FindExportFaults(const HealthInput& input, Findings* findings);

// Directories that stay exported although they are no shares any more.
Status FindExportsOfLeftShares(const HealthInput& input, Findings* findings);

// Shares that other files than /etc/exports export.
Status FindForeignExports(const HealthInput& input, Findings* findings);

// Lines whose path leads to another directory by a symbolic link.
Status FindLinkedExports(const HealthInput& input, Findings* findings);

// Shares whose folder does not exist.
Status FindMissingFolders(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_EXPORT_FINDINGS_H

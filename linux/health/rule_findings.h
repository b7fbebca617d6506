// Checks of what the export rules of different clients and directories mean together.
#ifndef VORN_LINUX_HEALTH_RULE_FINDINGS_H
#define VORN_LINUX_HEALTH_RULE_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// Rules for a network with a prefix of length 0, which admit far fewer clients than they seem to.
Status FindNarrowNetworks(const HealthInput& input, Findings* findings);

// Rules that have no effect, because an earlier rule of the directory has all their addresses.
Status FindHiddenRules(const HealthInput& input, Findings* findings);

// Volumes that "crossmnt" of an outer directory opens to clients which their own rules do not name.
Status FindCrossedVolumes(const HealthInput& input, Findings* findings);

// Shares inside another exported directory of the same file system.
Status FindNestedShares(const HealthInput& input, Findings* findings);

// Shares of one file system with different clients; at most one finding.
Status FindSharedFileSystems(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_RULE_FINDINGS_H

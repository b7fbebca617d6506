// Checks of the host names in export rules, by what is known of them without asking a name server.
#ifndef VORN_LINUX_HEALTH_NAME_FINDINGS_H
#define VORN_LINUX_HEALTH_NAME_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// Hosts without a known address, so that a rule is not in force.
Status FindUnknownHosts(const HealthInput& input, Findings* findings);

// Hosts that have another address in /etc/hosts than in the rules in force.
Status FindMovedHosts(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_NAME_FINDINGS_H

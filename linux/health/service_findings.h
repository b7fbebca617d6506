// Checks of the service itself: whether it serves, which versions, whether clients reach it.
#ifndef VORN_LINUX_HEALTH_SERVICE_FINDINGS_H
#define VORN_LINUX_HEALTH_SERVICE_FINDINGS_H

#include <optional>
#include <string>
#include <vector>

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// A service that is switched on and does not serve, with the reason as far as it can be seen; at most one finding.
Status FindStoppedService(const HealthInput& input, Findings* findings);

// Versions of NFS that the running service has and the files do not, or the reverse.
Status FindVersionsNotInForce(const HealthInput& input, Findings* findings);

// Packet filters of other programs that keep a port closed.
Status FindClosedPorts(const HealthInput& input, Findings* findings);

// Adds what DescribeClosedPorts() (firewall_table.h) tells.
Status JudgePorts(const std::optional<std::vector<std::string>>& closed, Findings* findings);

// File systems that have no room for what is written: configuration files, the history, the shares.
Status FindFullFileSystems(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_SERVICE_FINDINGS_H

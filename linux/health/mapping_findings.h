// Checks of the ID map.
#ifndef VORN_LINUX_HEALTH_MAPPING_FINDINGS_H
#define VORN_LINUX_HEALTH_MAPPING_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// Static mappings to a user who does not exist.
Status FindMappingsToNobody(const HealthInput& input, Findings* findings);

// Static mappings to an account with the user id 0.
Status FindMappingsToRoot(const HealthInput& input, Findings* findings);

// Static mappings that no daemon reads; at most one finding.
Status FindMappingsWithoutEffect(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_MAPPING_FINDINGS_H

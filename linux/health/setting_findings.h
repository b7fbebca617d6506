// Checks of nfs.conf(5) and idmapd.conf(5).
#ifndef VORN_LINUX_HEALTH_SETTING_FINDINGS_H
#define VORN_LINUX_HEALTH_SETTING_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// Files that the programs of nfs-utils cannot read to the end, and plug-ins that are missing.
Status FindSettingFaults(const HealthInput& input, Findings* findings);

// Values that their daemons cannot use and ignore.
Status FindIgnoredSettings(const HealthInput& input, Findings* findings);

// Settings of this management that another file overrides.
Status FindOverriddenSettings(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_SETTING_FINDINGS_H

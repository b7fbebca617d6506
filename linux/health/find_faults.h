// Finds the faults of the NFS service of a box.
#ifndef VORN_LINUX_HEALTH_FIND_FAULTS_H
#define VORN_LINUX_HEALTH_FIND_FAULTS_H

#include <string>
#include <vector>

#include "box.h"
#include "health.h"

namespace vorn {

// Makes all checks, in a draft of a box those that do not depend on the running service. Takes no lock and does not ask
// the name service.
VORN::HealthReport FindFaults(Box& box);

// The same for the checks that a draft has, also on the box itself.
VORN::HealthReport FindFaultsOfFiles(Box& box);

// Returns the findings of `now` that `before` does not have. The number of a line is no difference: an edit moves other
// lines.
std::vector<VORN::HealthFinding> FindAdded(const std::vector<VORN::HealthFinding>& before,
                                           const std::vector<VORN::HealthFinding>& now);

// Returns the kinds of findings in the order of a report.
std::vector<std::string> KindsOfFaults();

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_FIND_FAULTS_H

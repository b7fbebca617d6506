// Finds the faults of the NFS service of a box.
#ifndef VORN_LINUX_HEALTH_FIND_FAULTS_H
#define VORN_LINUX_HEALTH_FIND_FAULTS_H

#include <string>
#include <vector>

#include "box.h"
#include "health.h"

namespace vorn {

// Makes all checks. Takes no lock and does not ask the name service.
VORN::HealthReport FindFaults(Box& box);

// Returns the kinds of findings in the order of a report.
std::vector<std::string> KindsOfFaults();

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_FIND_FAULTS_H

// Changes in the name services that concern export rules.
#ifndef VORN_LINUX_SERVICE_NAME_CHANGES_H
#define VORN_LINUX_SERVICE_NAME_CHANGES_H

#include <functional>
#include <string>

#include "apply_exports.h"
#include "box.h"
#include "status.h"

namespace vorn {

// Returns the members of a netgroup (getnetgrent(3)), in a form in which two results can be compared.
using NetgroupReader = std::function<std::string(const std::string& netgroup)>;
std::string ReadNetgroup(const std::string& netgroup);

// Resolves the host names of all export rules again and applies addresses that changed. A name that has no address now
// keeps those that it had. If the members of a netgroup of the table have changed, the kernel's server asks again to
// which clients an address belongs.
Status ApplyNameChanges(Box& box, const ExportsEnvironment& environment, const NetgroupReader& read_netgroup);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_NAME_CHANGES_H

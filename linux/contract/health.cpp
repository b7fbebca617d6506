#include "health.h"

#include <utility>

#include "call.h"
#include "current_box.h"
#include "find_faults.h"

namespace VORN {

// The remarks of the readers are findings, and are therefore not told a second time as warnings of the call.
HealthReport CheckHealth() {
  CallDescription description;
  if (const CallContext* call = CallContext::Current(); call != nullptr) description = call->description();
  description.may_write = false;
  const CallContext quiet(std::move(description));
  return vorn::FindFaults(vorn::CurrentBox());
}

std::vector<std::string> HealthKinds() { return vorn::KindsOfFaults(); }

}  // namespace VORN

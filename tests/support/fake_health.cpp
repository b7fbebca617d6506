// The findings of the fake platform.
#include "fake_platform.h"
#include "health.h"

namespace VORN {

HealthReport CheckHealth() {
  FakePlatform& platform = FakePlatform::Current();
  platform.Record("CheckHealth");
  return platform.health;
}

std::vector<std::string> HealthKinds() { return {"exports_fault", "left_share"}; }

}  // namespace VORN

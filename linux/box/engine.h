// The NFS service of a box.
#ifndef VORN_LINUX_BOX_ENGINE_H
#define VORN_LINUX_BOX_ENGINE_H

#include "status.h"

namespace vorn {

class Box;

// Each operation returns when the service is in its new state, or has failed to reach it. IsEnabled may be
// called at any time by any thread; the caller excludes two of the other operations at once.
class Engine {
 public:
  virtual ~Engine() = default;

  // Whether the service is started at boot.
  virtual Result<bool> IsEnabled() = 0;

  virtual Status Start() = 0;  // also enables the service for the next boot
  virtual Status Stop() = 0;   // also disables it
  virtual Status Restart() = 0;

  // Applies the difference between the export rules that are in force and those that are stored now; everything else
  // stays in force as it is. A service that does not serve has nothing to reload; that is a success.
  virtual Status Reload() = 0;

  // Applies what the name services say now of the hosts and netgroups in the export rules.
  virtual Status RefreshNames() = 0;

  // Does in `draft`, a draft of the engine's box, what applying the export rules would do in the files of the box, and
  // remarks what it would remark. Changes nothing else. `starts`: the service would start before.
  virtual Status RehearseRules(Box& draft, bool starts) = 0;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_ENGINE_H

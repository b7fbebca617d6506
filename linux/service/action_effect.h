// The effect on clients of an operation that a rehearsal has recorded.
#ifndef VORN_LINUX_SERVICE_ACTION_EFFECT_H
#define VORN_LINUX_SERVICE_ACTION_EFFECT_H

#include <optional>
#include <string>

#include "box.h"

namespace vorn {

struct ActionEffect {
  const char* action;   // "restart"
  const char* clients;  // "nothing", "reload", "restart", "start", "stop" or "disconnect"
  std::optional<int> grace_seconds;
  std::string effect;  // a sentence
};

// Describes the action with the settings that the draft has now. The grace period of a restart is that of nfs.conf(5)
// ([nfsd] grace-time), else that of the kernel.
ActionEffect EffectOf(RehearsedAction action, Box& draft);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_ACTION_EFFECT_H

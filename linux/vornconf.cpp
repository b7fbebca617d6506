#include <map>

#include "core.h"
#include "error.h"
#include "lock.h"

namespace {

// VornConf has no room for a lock of its own: its layout is the contract's. So its address names it.
std::map<const VornConf*, vorn::ConfigurationLock>& Locks() {
  thread_local std::map<const VornConf*, vorn::ConfigurationLock> locks;
  return locks;
}

}  // namespace

VornConf::VornConf() { vorn::ToResult(Locks().try_emplace(this).first->second.status()); }

VornConf::~VornConf() { Locks().erase(this); }

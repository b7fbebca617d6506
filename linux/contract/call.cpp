#include "call.h"

#include <memory>

#include "configuration_lock.h"
#include "current_box.h"
#include "error.h"

namespace VORN {
namespace {

vorn::ConfigurationLock* LockOf(void* lock) { return static_cast<vorn::ConfigurationLock*>(lock); }

}  // namespace

CallLock::CallLock() : lock_(std::make_unique<vorn::ConfigurationLock>(vorn::CurrentBox()).release()) {
  vorn::ToResult(LockOf(lock_)->status());
}

CallLock::~CallLock() { const std::unique_ptr<vorn::ConfigurationLock> lock(LockOf(lock_)); }

bool CallLock::held() const { return LockOf(lock_)->status().ok(); }

}  // namespace VORN

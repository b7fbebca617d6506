#include "configuration_lock.h"

#include <algorithm>
#include <map>
#include <memory>
#include <new>
#include <vector>

#include "call.h"
#include "call_rights.h"
#include "files.h"

namespace vorn {
namespace {

// The configuration context of one box.
struct Context {
  Box* box;
  std::unique_ptr<HeldLock> lock;  // null during a pause, and after it if the lock could not be taken again
  int depth = 0;
  std::map<std::string, Version> first_reads;
};

// The contexts of a thread, in the order in which they began. Each pause adds a layer that begins empty.
using Layer = std::vector<Context>;
thread_local std::vector<Layer> layers(1);

Context* Find(const Box& box) {
  Layer& layer = layers.back();
  const auto found = std::find_if(layer.begin(), layer.end(), [&](const Context& c) { return c.box == &box; });
  return found == layer.end() ? nullptr : &*found;
}

Status TakeLock(Context* context, std::chrono::milliseconds limit) {
  Result<std::unique_ptr<HeldLock>> lock = context->box->Lock(kConfigurationLockFile, limit);
  if (!lock.ok()) return lock.status();
  context->lock = std::move(*lock);
  return {};
}

Status Enter(Box& box, std::chrono::milliseconds limit) {
  Context* context = Find(box);
  if (context == nullptr) {
    Context fresh{&box, nullptr, 1, {}};
    if (Status status = TakeLock(&fresh, limit); !status.ok()) return status;
    layers.back().push_back(std::move(fresh));
    return {};
  }
  if (context->lock == nullptr) {
    if (Status status = TakeLock(context, limit); !status.ok()) return status;
  }
  ++context->depth;
  return {};
}

// Ends the change of a call whose lock was released before.
void EndPostponedChange(Box& box) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) box.recorder()->Abandon(lock.status());
}

// The change of a call ends with the call: the service operations that follow without the lock belong to it.
void EndChange(Box& box) {
  VORN::CallContext* call = VORN::CallContext::Current();
  if (call == nullptr || call->has_ended()) return box.recorder()->End();
  if (!box.recorder()->Postpone()) return;
  try {
    call->AtEnd([&box] { EndPostponedChange(box); });
  } catch (const std::bad_alloc&) {
    box.recorder()->End();
  }
}

void Leave(Box& box) {
  Context* context = Find(box);
  if (context == nullptr || --context->depth > 0) return;
  const bool is_outermost = layers.size() == 1;
  if (is_outermost && context->lock != nullptr && box.recorder() != nullptr) EndChange(box);
  Layer& layer = layers.back();
  layer.erase(layer.begin() + (context - layer.data()));
}

}  // namespace

ConfigurationLock::ConfigurationLock(Box& box, std::chrono::milliseconds limit) : box_(box) {
  if (!MayWrite()) return;
  status_ = Enter(box_, limit);
  entered_ = status_.ok();
}

ConfigurationLock::~ConfigurationLock() {
  if (entered_) Leave(box_);
}

LockPause::LockPause() {
  for (Context& context : layers.back()) context.lock.reset();
  layers.emplace_back();
}

LockPause::~LockPause() {
  layers.pop_back();
  for (Context& context : layers.back()) static_cast<void>(TakeLock(&context, kConfigurationLockLimit));
}

void FirstReads::Note(Box& box, const std::string& path, const Version& version) {
  if (Context* context = Find(box)) context->first_reads.emplace(path, version);
}

Status FirstReads::Check(Box& box, const std::string& path, const Version& version) {
  const Context* context = Find(box);
  if (context == nullptr) return {};
  const auto first = context->first_reads.find(path);
  const bool same = first == context->first_reads.end() || first->second == version;
  return same ? Status() : ChangedBehind(path);
}

void FirstReads::Renew(Box& box, const std::string& path, const Version& version) {
  if (Context* context = Find(box)) context->first_reads[path] = version;
}

}  // namespace vorn

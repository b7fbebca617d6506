#include "current_box.h"

#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "call.h"
#include "draft.h"
#include "engines.h"
#include "file_store.h"
#include "root.h"

namespace vorn {
namespace {

struct Registry {
  std::mutex mutex;
  std::map<std::string, std::unique_ptr<Box>> boxes;  // by root directory
};

// Never destroyed: other threads may still run calls while the process exits.
Registry& Boxes() {
  static auto* registry = new Registry;
  return *registry;
}

}  // namespace

Box& CurrentBox() {
  const VORN::CallContext* call = VORN::CallContext::Current();
  const VORN::Draft* draft = call == nullptr ? nullptr : call->description().draft;
  return draft == nullptr ? RealBox() : draft->state().box;
}

Box& RealBox() {
  const Root root = Root::Current();
  Registry& registry = Boxes();
  const std::lock_guard lock(registry.mutex);
  std::unique_ptr<Box>& box = registry.boxes[root.directory()];
  if (box == nullptr) box = std::make_unique<Box>(root, std::make_unique<FileStore>(root), MakeEngineChooser());
  return *box;
}

}  // namespace vorn

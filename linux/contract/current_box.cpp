#include "current_box.h"

#include <map>
#include <memory>
#include <mutex>
#include <string>

#include "call.h"
#include "change_history.h"
#include "draft.h"
#include "engines.h"
#include "file_store.h"
#include "keytab.h"
#include "keytab_file.h"
#include "platform_settings.h"
#include "root.h"

namespace vorn {
namespace {

struct Registry {
  std::mutex mutex;
  std::map<std::string, std::unique_ptr<Box>> boxes;  // by root directory
};

// A configuration that cannot be read records nothing; the operations that need it fail.
History::Settings HistorySettings(Box& box) {
  const auto settings = PlatformSettings::Load(box);
  return settings.ok() ? History::Settings{(*settings)->history, (*settings)->history_changes} : History::Settings{};
}

std::unique_ptr<Box> MakeBox(const Root& root) {
  auto box = std::make_unique<Box>(root, std::make_unique<FileStore>(root), MakeEngineChooser());
  const auto settings = [box = box.get()] { return HistorySettings(*box); };
  box->RecordChanges(std::make_unique<History>(root, box->store(), History::Environment{settings, WithoutKeys}));
  return box;
}

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
  if (box == nullptr) box = MakeBox(root);
  return *box;
}

// Each real box has a History as its recorder.
History& RealHistory() { return static_cast<History&>(*RealBox().recorder()); }

}  // namespace vorn

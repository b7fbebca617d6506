#include "engines.h"

#include <mutex>

#include "platform_settings.h"

namespace vorn {
namespace {

// Each engine is created when it is first chosen.
struct Engines {
  std::mutex mutex;
  std::unique_ptr<Engine> systemd;
  std::unique_ptr<Engine> paper;
};

}  // namespace

Box::EngineChooser MakeEngineChooser() {
  return [engines = std::make_shared<Engines>()](Box& box) -> Result<Engine*> {
    const auto settings = PlatformSettings::Load(box);
    if (!settings.ok()) return settings.status();
    const bool is_systemd = (*settings)->engine == PlatformSettings::EngineKind::kSystemd;
    const std::lock_guard lock(engines->mutex);
    std::unique_ptr<Engine>& engine = is_systemd ? engines->systemd : engines->paper;
    if (engine == nullptr) engine = is_systemd ? MakeSystemdEngine(box) : MakePaperEngine(box);
    return engine.get();
  };
}

}  // namespace vorn

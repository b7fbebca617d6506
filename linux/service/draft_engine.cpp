#include <optional>
#include <utility>

#include "engines.h"

namespace vorn {
namespace {

class DraftEngine : public Engine {
 public:
  DraftEngine(Box& draft, ChosenEngine chosen) : draft_(draft), chosen_(std::move(chosen)) {}

  Result<bool> IsEnabled() override {
    if (enabled_) return *enabled_;
    const Result<Engine*> engine = chosen_();
    if (!engine.ok()) return engine.status();
    Result<bool> enabled = (*engine)->IsEnabled();
    if (enabled.ok()) enabled_ = *enabled;
    return enabled;
  }

  Status Start() override {
    enabled_ = true;
    return Apply(RehearsedAction::kStart, true);
  }
  Status Restart() override { return Apply(RehearsedAction::kRestart, true); }
  Status Reload() override { return Apply(RehearsedAction::kReload, false); }

  Status Stop() override {
    draft_.Rehearse(RehearsedAction::kStop);
    enabled_ = false;
    return {};
  }

  Status RefreshNames() override {
    draft_.Rehearse(RehearsedAction::kRefreshNames);
    return {};
  }

  Status RehearseRules(Box& draft, bool starts) override {
    const Result<Engine*> engine = chosen_();
    return engine.ok() ? (*engine)->RehearseRules(draft, starts) : engine.status();
  }

 private:
  Status Apply(RehearsedAction action, bool starts) {
    draft_.Rehearse(action);
    return RehearseRules(draft_, starts);
  }

  Box& draft_;
  const ChosenEngine chosen_;
  std::optional<bool> enabled_;  // as it would be; nullopt: not asked for
};

}  // namespace

std::unique_ptr<Engine> MakeDraftEngine(Box& draft, ChosenEngine chosen) {
  return std::make_unique<DraftEngine>(draft, std::move(chosen));
}

}  // namespace vorn

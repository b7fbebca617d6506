#include <syslog.h>

#include "engines.h"

namespace vorn {
namespace {

constexpr char kStateFile[] = "/var/lib/vorn/nfsd.state";
constexpr char kEnabled[] = "enabled\n";
constexpr char kDisabled[] = "disabled\n";

class PaperEngine : public Engine {
 public:
  explicit PaperEngine(Box& box) : box_(box) {}

  Result<bool> IsEnabled() override {
    const auto parse = [](const StoredFile& file) { return Result<bool>(file.text == kEnabled); };
    const Result<std::shared_ptr<const bool>> enabled = box_.Load<bool>(kStateFile, parse);
    if (!enabled.ok()) return enabled.status();
    return **enabled;
  }

  Status Start() override { return StoreState(kEnabled, "enabled and started"); }
  Status Stop() override { return StoreState(kDisabled, "stopped and disabled"); }
  Status Restart() override { return LogAction("restarted"); }
  Status Reload() override { return LogAction("reloaded"); }
  Status RefreshNames() override { return {}; }
  Status RehearseRules(Box& /*draft*/, bool /*starts*/) override { return {}; }

 private:
  Status StoreState(const char* state, const char* action) {
    const Result<StoredFile> before = box_.Read(kStateFile);
    if (!before.ok()) return before.status();
    const Status stored = box_.Replace(kStateFile, state, before->version);
    return stored.ok() ? LogAction(action) : stored;
  }

  static Status LogAction(const char* action) {
    syslog(LOG_NOTICE, "nfs-server.service would be %s: this root is no booted system", action);
    return {};
  }

  Box& box_;
};

}  // namespace

std::unique_ptr<Engine> MakePaperEngine(Box& box) { return std::make_unique<PaperEngine>(box); }

}  // namespace vorn

#include <syslog.h>

#include "files.h"
#include "root.h"
#include "service.h"

namespace vorn {
namespace {

constexpr char kStateFile[] = "/var/lib/vorn/nfsd.state";
constexpr char kEnabled[] = "enabled\n";
constexpr char kDisabled[] = "disabled\n";

class LocalEngine : public ServiceEngine {
 public:
  Result<bool> IsEnabled() override {
    const Result<std::string> path = Root::Current().Locate(kStateFile);
    if (!path.ok()) return path.status();
    const Result<FileText> state = ReadFileOrNothing(*path);
    if (!state.ok()) return state.status();
    return state->text == kEnabled;
  }

  Status Start() override { return Keep(kEnabled, "enabled and started"); }
  Status Stop() override { return Keep(kDisabled, "stopped and disabled"); }
  Status Restart() override { return Say("restarted"); }
  Status Reload() override { return Say("reloaded"); }

 private:
  Status Keep(const char* state, const char* deed) {
    const Result<std::string> path = Root::Current().Locate(kStateFile);
    if (!path.ok()) return path.status();
    const Result<FileText> before = ReadFileOrNothing(*path);
    if (!before.ok()) return before.status();
    const Status kept = ReplaceFile(*path, state, before->stamp);
    return kept.ok() ? Say(deed) : kept;
  }

  static Status Say(const char* deed) {
    syslog(LOG_NOTICE, "nfs-server.service would be %s: this root is no booted system", deed);
    return {};
  }
};

}  // namespace

std::unique_ptr<ServiceEngine> MakeLocalEngine() { return std::make_unique<LocalEngine>(); }

}  // namespace vorn

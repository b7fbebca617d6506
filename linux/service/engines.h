// The engines of a Linux box: the kernel server under systemd, the engine of a trial root, and the engine of a draft.
#ifndef VORN_LINUX_SERVICE_ENGINES_H
#define VORN_LINUX_SERVICE_ENGINES_H

#include <chrono>
#include <functional>
#include <memory>
#include <string>

#include "apply_exports.h"
#include "box.h"
#include "engine.h"

namespace vorn {

// Where the systemd engine finds the system; the defaults are those of a box.
struct SystemdOptions {
  std::string bus_address;  // of D-Bus; empty: the system bus
  std::string threads_file = "/proc/fs/nfsd/threads";
  std::chrono::seconds job_limit{120};  // for one job of systemd
  ExportsEnvironment exports;
};

// Controls nfs-server.service through org.freedesktop.systemd1(5). `box` outlives the engine.
std::unique_ptr<Engine> MakeSystemdEngine(Box& box, SystemdOptions options = {});

// For a root that is not a booted system: it stores the enabled state in /var/lib/vorn/nfsd.state, and logs what
// would have been done. `box` outlives the engine.
std::unique_ptr<Engine> MakePaperEngine(Box& box);

// For a draft of a box (Box::is_draft), which outlives the engine: it records each operation and does none. `chosen` is
// what chooses the engine of the box; the enabled state is that of the box until the draft is started or stopped.
using ChosenEngine = std::function<Result<Engine*>()>;
std::unique_ptr<Engine> MakeDraftEngine(Box& draft, ChosenEngine chosen);

// Chooses between the first two by the box's platform settings, each time it is called.
Box::EngineChooser MakeEngineChooser();

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_ENGINES_H

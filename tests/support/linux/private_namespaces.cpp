#include "private_namespaces.h"

#include <unistd.h>

#include "processes.h"

namespace {

using Command = std::vector<std::string>;

// In a chroot "/" is no mount point, so unshare(1) cannot make its mounts private there. nsenter(1) reaches the root
// of the new mount namespace, from where all mounts are made private; the program itself stays in the chroot.
constexpr char kMakeMountsPrivate[] = R"(nsenter --mount=/proc/self/ns/mnt mount --make-rprivate / && exec "$0" "$@")";

Command AsRoot() {
  return {"unshare", "--mount", "--net", "--propagation", "unchanged", "sh", "-c", kMakeMountsPrivate};
}

Command WithUserNamespace() { return {"unshare", "--map-root-user", "--mount", "--net"}; }

// Some systems create a user namespace but deny its root every mount, so the probe mounts something.
ProgramResult Probe(Command command) {
  for (const char* word : {"mount", "-t", "tmpfs", "tmpfs", "/mnt"}) command.emplace_back(word);
  return RunProgram(command);
}

PrivateNamespaces Find() {
  std::vector<Command> candidates{WithUserNamespace()};
  if (geteuid() == 0) candidates.insert(candidates.begin(), AsRoot());
  std::string error;
  for (const Command& command : candidates) {
    const ProgramResult result = Probe(command);
    if (result.status == 0) return {command, ""};
    error = result.errors.substr(0, result.errors.find('\n'));
  }
  return {{}, "mount and network namespaces are not permitted here: " + error};
}

}  // namespace

const PrivateNamespaces& GetPrivateNamespaces() {
  static const PrivateNamespaces found = Find();
  return found;
}

// The firewall table of the NFS service: "inet vorn", which nobody else writes and which is all that is
// written here. No table can lift what another one drops, so this one drops and accepts nothing: it marks
// what comes for the service's configured ports, before the box's own tables see it. A box that lets
// nothing in but what it knows accepts these packets with "meta mark & 0x01000000 != 0 accept".
//
// A unit of the package loads the file with the table when the box boots.
#include "firewall.h"

#include <nftables/libnftables.h>

#include <memory>
#include <string>

#include "error.h"
#include "files.h"
#include "lock.h"
#include "nfs_ports.h"
#include "root.h"
#include "settings.h"

namespace vorn {
namespace {

struct FreeContext {
  void operator()(nft_ctx* context) const { nft_ctx_free(context); }
};

// One transaction: the old table goes and the new one comes, or all stays as it was.
std::string Ruleset(const std::vector<ConfiguredPort>& ports) {
  std::string rules =
      "table inet vorn\n"
      "delete table inet vorn\n"
      "table inet vorn {\n"
      "  chain nfs {\n"
      "    type filter hook input priority filter - 1; policy accept;\n";
  for (const ConfiguredPort& port : ports) {
    const std::string number = std::to_string(port.port);
    rules += "    meta l4proto { tcp, udp } th dport " + number + " meta mark set meta mark | 0x01000000 comment \"" +
             port.service + "\"\n";
  }
  return rules + "  }\n}\n";
}

Status Load(const std::string& ruleset) {
  const std::unique_ptr<nft_ctx, FreeContext> context(nft_ctx_new(NFT_CTX_DEFAULT));
  if (!context) return Status::Failure(ENOMEM, "libnftables has no context");
  nft_ctx_buffer_error(context.get());
  nft_ctx_buffer_output(context.get());
  if (nft_run_cmd_from_buffer(context.get(), ruleset.c_str()) == 0) return {};
  return Status::Failure(kServiceFailed, std::string("nftables: ") + nft_ctx_get_error_buffer(context.get()));
}

Status Keep(const std::string& ruleset) {
  const ConfigurationLock lock;
  if (!lock.status().ok()) return lock.status();
  const Result<std::string> path = Root::Current().Locate("/var/lib/vorn/firewall.nft");
  if (!path.ok()) return path.status();
  const Result<FileText> before = ReadFileOrNothing(*path);
  return before.ok() ? ReplaceFile(*path, ruleset, before->stamp) : before.status();
}

Status FollowPorts() {
  const Result<Settings> settings = Settings::Load();
  if (!settings.ok()) return settings.status();
  if (!settings->firewall) return {};
  const auto ports = ConfiguredPorts();
  if (!ports.ok()) return ports.status();
  const std::string ruleset = Ruleset(*ports);
  const Status kept = Keep(ruleset);
  return kept.ok() ? Load(ruleset) : kept;
}

}  // namespace
}  // namespace vorn

int VORNFwRuleHup(void) { return vorn::ToResult(vorn::FollowPorts()); }

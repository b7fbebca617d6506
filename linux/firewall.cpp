// The firewall table of the NFS service: "inet vorn", which nobody else writes and which is all that is
// written here. It accepts the service's configured ports and has no say in others; what the box's
// own tables drop stays dropped.
#include "firewall.h"

#include <nftables/libnftables.h>

#include <memory>
#include <string>

#include "error.h"
#include "nfs_ports.h"
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
      "    type filter hook input priority filter; policy accept;\n";
  for (const ConfiguredPort& port : ports) {
    const std::string number = std::to_string(port.port);
    rules += "    meta l4proto { tcp, udp } th dport " + number + " accept comment \"" + port.service + "\"\n";
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

Status FollowPorts() {
  const Result<Settings> settings = Settings::Load();
  if (!settings.ok()) return settings.status();
  if (!settings->firewall) return {};
  const auto ports = ConfiguredPorts();
  return ports.ok() ? Load(Ruleset(*ports)) : ports.status();
}

}  // namespace
}  // namespace vorn

int VORNFwRuleHup(void) { return vorn::ToResult(vorn::FollowPorts()); }

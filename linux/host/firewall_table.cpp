#include "firewall_table.h"

#include <nftables/libnftables.h>

#include <cerrno>
#include <string>
#include <vector>

#include "configuration_lock.h"
#include "configured_ports.h"
#include "foreign_firewalls.h"
#include "notice.h"
#include "owned.h"
#include "platform_settings.h"

namespace vorn {
namespace {

// One transaction: it deletes the old table and adds the new one, or fails and changes nothing.
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
  const Owned<nft_ctx, nft_ctx_free> context(nft_ctx_new(NFT_CTX_DEFAULT));
  if (!context) return Status::Failure(ENOMEM, "libnftables has no context");
  nft_ctx_buffer_error(context.get());
  nft_ctx_buffer_output(context.get());
  if (nft_run_cmd_from_buffer(context.get(), ruleset.c_str()) == 0) return {};
  return Status::Failure(kServiceFailed, std::string("nftables: ") + nft_ctx_get_error_buffer(context.get()));
}

std::optional<std::vector<std::string>> FindClosedPorts(const std::vector<ConfiguredPort>& ports) {
  const Owned<nft_ctx, nft_ctx_free> context(nft_ctx_new(NFT_CTX_DEFAULT));
  if (!context) return std::nullopt;
  nft_ctx_buffer_error(context.get());
  nft_ctx_buffer_output(context.get());
  nft_ctx_output_set_flags(context.get(), NFT_CTX_OUTPUT_STATELESS);
  if (nft_run_cmd_from_buffer(context.get(), "list ruleset") != 0) return std::nullopt;
  return FindClosedFirewalls(nft_ctx_get_output_buffer(context.get()), ports);
}

// Logs once what keeps the ports closed. Only a remark: other programs decide over their own tables.
void NoticeClosedPorts(const std::vector<ConfiguredPort>& ports) {
  const std::optional<std::vector<std::string>> closed = FindClosedPorts(ports);
  for (const std::string& sentence : closed ? *closed : std::vector<std::string>()) {
    NoticeOnce("nftables", Version(), sentence);
  }
}

Status Save(Box& box, const std::string& ruleset) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<StoredFile> before = box.Read(kFirewallFile);
  return before.ok() ? box.Replace(kFirewallFile, ruleset, before->version) : before.status();
}

}  // namespace

Status UpdateFirewall(Box& box) {
  const auto settings = PlatformSettings::Load(box);
  if (!settings.ok()) return settings.status();
  if (!(*settings)->firewall) return {};
  const auto ports = ReadConfiguredPorts(box);
  if (!ports.ok()) return ports.status();
  const std::string ruleset = Ruleset(*ports);
  if (Status status = Save(box, ruleset); !status.ok()) return status;
  if (box.Rehearse(RehearsedAction::kFirewall)) return {};
  if (Status status = Load(ruleset); !status.ok()) return status;
  NoticeClosedPorts(*ports);
  return {};
}

std::optional<std::vector<std::string>> DescribeClosedPorts(Box& box, const std::vector<ConfiguredPort>& ports) {
  return box.root().is_box() ? FindClosedPorts(ports) : std::nullopt;
}

}  // namespace vorn

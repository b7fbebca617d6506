#include "share_clients.h"

#include <algorithm>
#include <map>
#include <optional>
#include <set>
#include <tuple>
#include <utility>

#include "address_ranges.h"
#include "explain.h"
#include "exports_client.h"
#include "folder_path.h"
#include "shares.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr char kNewestVersion[] = "4.2";
constexpr char kAnyHost[] = "192.0.2.1";  // no host has this address (RFC 5737)
constexpr std::size_t kMostCandidates = 100;

struct Row {
  VORN::ClientAccess access;
  const TableExport* rule = nullptr;  // that names the client; nullptr if none does
};

// By address, and names after addresses.
bool IsEarlier(const KnownClient& a, const KnownClient& b) {
  const auto order = [](const KnownClient& known) {
    const std::optional<AddressRange> range = AddressRangeOf(known.client);
    return std::make_tuple(!range, range ? range->first : AddressBytes{}, known.client);
  };
  return order(a) < order(b);
}

// Makes the rows of all clients, and explains those of a page.
class ClientTable {
 public:
  ClientTable(Explainer& explainer, const VORN::ClientsQuestion& question, std::string path)
      : explainer_(explainer), question_(question), path_(std::move(path)) {}

  void AddRules() {
    std::set<std::string> clients;
    for (const TableExport& one : explainer_.ExportsAround(path_)) {
      if (!IsAtOrBelow(path_, one.directory)) continue;
      const std::string key = ExportClientKey(one.client);
      if (!clients.insert(key).second) continue;
      if (const auto range = AddressRangeOf(one.client)) ranges_.Add(*range);
      if (one.kind == ExportKind::kHost) {
        AddHost(key, one);
      } else {
        Add(one.written, &one);
      }
    }
    ranges_.Sort();
  }

  void AddKnown(std::vector<KnownClient> known) {
    std::stable_sort(known.begin(), known.end(), IsEarlier);
    for (const KnownClient& client : known) {
      VORN::ClientAccess& access = RowOf(client.client).access;
      if (!access.state.empty()) continue;  // a second client of the address
      access.state = client.state;
      access.version = client.version;
    }
  }

  Result<ShareClients> Explain() {
    ShareClients result;
    result.total = rows_.size();
    const std::size_t begin = question_.offset < rows_.size() ? question_.offset : 0;
    const std::size_t end = begin + std::min(question_.limit, rows_.size() - begin);
    for (std::size_t at = begin; at < end; ++at) {
      if (Status status = Explain(&rows_[at]); !status.ok()) return status;
      result.clients.push_back(rows_[at].access);
    }
    return result;
  }

 private:
  Row& Add(const std::string& client, const TableExport* rule, const std::string& address = "") {
    Row row;
    row.access.client = ToValidUtf8(client);
    row.access.address = address;
    row.rule = rule;
    if (rule != nullptr) row.access.kind = NameOf(rule->kind);
    if (!address.empty()) addresses_.push_back(address);
    const std::string key = address.empty() ? ExportClientKey(client) : address;
    by_host_.try_emplace(key, rows_.size());
    return rows_.emplace_back(std::move(row));
  }

  // Adds a row for each address of a host; one without an address if none is known.
  void AddHost(const std::string& key, const TableExport& one) {
    if (!IsExportHostName(key)) {
      Add(one.written, &one, key);
      return;
    }
    const HostAddresses& hosts = explainer_.in_force().hosts;
    auto known = hosts.find(key);
    if (known == hosts.end()) known = hosts.find(ExportClientKey(one.written));
    if (known == hosts.end()) {
      Add(one.written, &one);
      return;
    }
    for (const std::string& address : known->second) {
      if (const auto range = AddressRangeOf(address)) ranges_.Add(*range);
      Add(one.written, &one, address);
    }
  }

  // The row of a host by its address or name, which is added if there is none.
  Row& RowOf(const std::string& host) {
    const std::optional<std::string> address = HostAddress(host);
    const auto found = by_host_.find(address ? *address : ExportClientKey(host));
    return found != by_host_.end() ? rows_[found->second] : Add(host, nullptr, address.value_or(""));
  }

  Status Explain(Row* row) {
    VORN::ClientAccess& access = row->access;
    if (!question_.access.version.empty()) access.version = question_.access.version;
    if (access.version.empty()) access.version = kNewestVersion;
    if (access.address.empty()) {
      if (Status status = ChooseAddress(row); !status.ok()) return status;
    }
    if (access.address.empty()) return {};
    const ClientHost host = explainer_.FindClient(access.address);
    if (host.is_away) {
      access.text += (access.text.empty() ? "" : " ") +
                     std::string("The name service did not answer, so that rules for names may be missing.");
    }
    for (const std::string& flavor : question_.flavors) {
      Result<VORN::AccessAnswer> answer = Ask(host, access.version, flavor);
      if (!answer.ok()) return answer.status();
      access.flavors.push_back({flavor, answer->mountable, answer->read, answer->write});
      access.rule = std::move(answer->rule);
    }
    return {};
  }

  Result<VORN::AccessAnswer> Ask(const ClientHost& host, const std::string& version, const std::string& flavor) {
    VORN::AccessQuestion question = question_.access;
    question.version = version;
    question.flavor = flavor;
    return explainer_.Explain(question, path_, host);
  }

  Status ChooseAddress(Row* row) {
    const ExportKind kind = row->rule == nullptr ? ExportKind::kHost : row->rule->kind;
    switch (kind) {
      case ExportKind::kHost:
        ChooseOfHost(&row->access);
        return {};
      case ExportKind::kNetwork:
        ChooseOfNetwork(row->rule->client, &row->access);
        return {};
      case ExportKind::kEverybody:
        ChooseOfAll(&row->access);
        return {};
      case ExportKind::kPattern:
      case ExportKind::kNetgroup:
        break;
    }
    return ChooseKnown(*row->rule, &row->access);
  }

  void ChooseOfHost(VORN::ClientAccess* access) {
    const ClientHost host = explainer_.FindClient(access->client);
    if (!host.addresses.empty()) {
      access->address = host.addresses.front();
    } else {
      access->text =
          host.is_away ? "The name service did not answer." : "The name service has no address for this host.";
    }
  }

  void ChooseOfNetwork(const std::string& client, VORN::ClientAccess* access) {
    const std::optional<AddressRange> network = AddressRangeOf(client);
    if (!network) {
      ChooseOfMask(client, access);
      return;
    }
    const AddressBytes first = FirstHostOf(*network);
    const std::optional<AddressBytes> free = ranges_.FirstFree(*network, first);
    access->address = TextOf(free.value_or(first));
    access->text = free ? access->address + " stands for the hosts of this network that no narrower rule names."
                        : "Narrower rules name every host of this network; " + access->address + " is one of them.";
  }

  // Chooses an address of a network whose mask has gaps.
  static void ChooseOfMask(const std::string& client, VORN::ClientAccess* access) {
    const auto network = ReadExportNetwork(client);
    if (!network) {
      access->text = "The server cannot read this network.";
      return;
    }
    const std::string key = ExportNetworkKey(*network);
    access->address = key.substr(0, key.find('/'));
    access->text = access->address + " is one of the hosts of this network; others may match further rules.";
  }

  void ChooseOfAll(VORN::ClientAccess* access) {
    const std::optional<AddressRange> all = AddressRangeOf("0.0.0.0/0.0.0.0");
    const std::optional<AddressRange> any = AddressRangeOf(kAnyHost);
    access->address = TextOf(ranges_.FirstFree(*all, any->first).value_or(any->first));
    access->text = access->address + " stands for the hosts that no other rule names.";
  }

  // Chooses one of the clients with a known address, if possible one for which the rule decides.
  Status ChooseKnown(const TableExport& one, VORN::ClientAccess* access) {
    bool is_away = false;
    const std::size_t count = std::min(addresses_.size(), kMostCandidates);
    for (std::size_t at = 0; at < count; ++at) {
      ClientHost host = explainer_.FindClient(addresses_[at]);
      const bool is_one = explainer_.Matches(&host, one);
      is_away = is_away || host.is_away;
      if (!is_one) continue;
      const Result<VORN::AccessAnswer> answer = Ask(host, access->version, question_.flavors.front());
      if (!answer.ok()) return answer.status();
      const bool decides = answer->rule && answer->rule->client == access->client;
      if (decides || access->address.empty()) access->address = addresses_[at];
      if (decides) break;
    }
    if (!access->address.empty()) {
      access->text = access->address + " is one of these clients; others may match further rules.";
    } else {
      access->text = is_away ? "The name service did not answer."
                             : "No client that the box knows is one of these clients, so that none can be explained.";
    }
    return {};
  }

  Explainer& explainer_;
  const VORN::ClientsQuestion& question_;
  const std::string path_;
  std::vector<Row> rows_;
  std::map<std::string, std::size_t> by_host_;  // the first row of an address or of a name
  std::vector<std::string> addresses_;          // of hosts that rules name, and of known clients
  AddressRanges ranges_;                        // of the clients that rules name
};

}  // namespace

Result<ShareClients> ExplainClients(Box& box, const NameService& names, const VORN::ClientsQuestion& question,
                                    const std::vector<KnownClient>& known) {
  Result<std::string> path = FindSharePath(box, question.access.share);
  if (!path.ok()) return path.status();
  Result<Explainer> explainer = Explainer::Open(box, NameService::Remembering(names));
  if (!explainer.ok()) return explainer.status();
  ClientTable table(*explainer, question, std::move(*path));
  table.AddRules();
  table.AddKnown(known);
  return table.Explain();
}

}  // namespace vorn

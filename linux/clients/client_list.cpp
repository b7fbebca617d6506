#include "client_list.h"

#include <arpa/inet.h>

#include <algorithm>
#include <array>
#include <ctime>
#include <map>
#include <set>
#include <utility>

#include "connections.h"
#include "kernel_clients.h"
#include "served_exports.h"
#include "unicode.h"

namespace vorn {
namespace {

constexpr int kNFSPort = 2049;

// A client, and what it takes to complete its row.
struct Row {
  VORN::NFSClient client;
  std::string order;  // of addresses: the families, then the bytes
  const KernelClient* kernel = nullptr;
};

std::string OrderOf(const std::string& address) {
  std::array<char, 1 + sizeof(in6_addr)> bytes{};
  if (inet_pton(AF_INET, address.c_str(), &bytes[1]) == 1) {
    bytes[0] = '4';
    return {bytes.data(), 1 + sizeof(in_addr)};
  }
  if (inet_pton(AF_INET6, address.c_str(), &bytes[1]) != 1) return "9" + address;
  bytes[0] = '6';
  return {bytes.data(), bytes.size()};
}

// The time of day of a moment of CLOCK_MONOTONIC, both in seconds.
std::int64_t TimeOfDay(std::int64_t moment) {
  timespec now{};
  clock_gettime(CLOCK_MONOTONIC, &now);
  return std::time(nullptr) - now.tv_sec + moment;
}

// The facts about all clients of a box.
struct Sources {
  std::vector<KernelClient> clients;
  std::vector<Connection> connections;
  std::vector<RecordedMount> mounts;
  ServedExports served;
  ExportTraffics traffics;
  const MountLog* log = nullptr;
};

Result<std::string> ReadText(Box& box, const char* path) {
  Result<StoredFile> file = box.Read(path);
  if (!file.ok()) return file.status();
  return std::move(file->text);
}

// A cache that the kernel does not have has no entries.
std::vector<KernelCache::Entry> EntriesOf(const std::string& folder, const char* name) {
  return KernelCache(folder, name).Entries().value_or(std::vector<KernelCache::Entry>());
}

Status ReadTables(Box& box, Sources* sources) {
  for (const char* table : {kTCPConnections, kTCP6Connections}) {
    const Result<std::string> text = ReadText(box, table);
    if (!text.ok()) return text.status();
    const std::vector<Connection> found = ParseConnections(*text, kNFSPort);
    sources->connections.insert(sources->connections.end(), found.begin(), found.end());
  }
  const Result<std::string> mounts = ReadText(box, kRecordedMounts);
  if (!mounts.ok()) return mounts.status();
  sources->mounts = ParseRecordedMounts(*mounts);
  const Result<std::string> traffics = ReadText(box, kExportStatistics);
  if (!traffics.ok()) return traffics.status();
  sources->traffics = ParseExportTraffics(*traffics);
  return {};
}

Result<Sources> ReadSources(Box& box, const KernelClients& kernel, const MountLog& log) {
  Sources sources;
  sources.log = &log;
  Result<std::vector<KernelClient>> clients = kernel.List();
  if (!clients.ok()) return clients.status();
  sources.clients = std::move(*clients);
  if (Status status = ReadTables(box, &sources); !status.ok()) return status;
  const Result<std::string> caches = box.root().Locate(kKernelCaches);
  if (!caches.ok()) return caches.status();
  sources.served = ReadServedExports(EntriesOf(*caches, kAddressesCache), EntriesOf(*caches, kRightsCache));
  return sources;
}

VORN::ClientExport ExportOf(const Sources& sources, const std::string& path, const std::string& rule) {
  VORN::ClientExport used;
  used.path = ToValidUtf8(path);
  used.rule = ToValidUtf8(rule);
  const auto traffic = sources.traffics.find({path, rule});
  if (traffic == sources.traffics.end()) return used;
  used.bytes_read = traffic->second.bytes_read;
  used.bytes_written = traffic->second.bytes_written;
  used.since = TimeOfDay(traffic->second.begun);
  return used;
}

// `mounts` are the recorded ones of the address.
std::vector<VORN::ClientExport> ExportsOf(const Sources& sources, const std::string& address,
                                          const std::set<std::string>& mounts) {
  std::vector<VORN::ClientExport> exports;
  const auto rule = sources.served.rules.find(address);
  const auto served =
      rule == sources.served.rules.end() ? sources.served.paths.end() : sources.served.paths.find(rule->second);
  std::set<std::string> paths = mounts;
  if (served != sources.served.paths.end()) paths.insert(served->second.begin(), served->second.end());
  for (const std::string& path : paths) {
    const bool is_served = served != sources.served.paths.end() && served->second.count(path) != 0;
    exports.push_back(ExportOf(sources, path, is_served ? rule->second : ""));
    exports.back().is_mounted = mounts.count(path) != 0;
  }
  return exports;
}

const char* SentenceOf(const std::string& reason) {
  if (reason == "no_rule") return "No export rule is for this address.";
  if (reason == "port") return "The export rule accepts requests from reserved ports only.";
  return reason == "path" ? "There is no such path." : "The path is not exported to this address.";
}

// The refusals that mountd has logged.
void AddLogged(const MountLog& log, const std::string& address, std::vector<VORN::ClientRefusal>* refusals) {
  const auto logged = log.refused.find(address);
  if (logged == log.refused.end()) return;
  for (const auto& [request, refused] : logged->second) {
    const auto& [path, reason] = request;
    refusals->push_back({ToValidUtf8(path), reason, SentenceOf(reason), refused.count, refused.last});
  }
}

// The refusals that the kernel's server remembers.
void AddRemembered(const ServedExports& served, const std::string& address,
                   std::vector<VORN::ClientRefusal>* refusals) {
  if (served.refused.count(address) != 0) refusals->push_back({"", "no_rule", SentenceOf("no_rule"), 0, {}});
  const auto rule = served.rules.find(address);
  if (rule == served.rules.end()) return;
  const auto paths = served.unserved.find(rule->second);
  if (paths == served.unserved.end()) return;
  for (const std::string& path : paths->second) {
    refusals->push_back({ToValidUtf8(path),
                         "not_exported",
                         "A client of the rule \"" + ToValidUtf8(rule->second) +
                             "\" asked for a path that is not exported to these clients.",
                         0,
                         {}});
  }
}

std::vector<VORN::ClientRefusal> RefusalsOf(const Sources& sources, const std::string& address) {
  std::vector<VORN::ClientRefusal> refusals;
  AddRemembered(sources.served, address, &refusals);
  AddLogged(*sources.log, address, &refusals);
  const auto by_path = [](const auto& a, const auto& b) { return a.path < b.path; };
  std::stable_sort(refusals.begin(), refusals.end(), by_path);
  return refusals;
}

VORN::NFSClient Describe(const ClientInfo& info, std::uint64_t number) {
  VORN::NFSClient client;
  client.address = info.address;
  client.name = ToValidUtf8(info.name);
  if (info.minor_version) client.version = "4." + std::to_string(*info.minor_version);
  client.state = ToValidUtf8(info.status);
  client.id = number;
  client.client_id = ToValidUtf8(info.client_id);
  client.implementation = ToValidUtf8(info.implementation);
  client.renewed = info.seconds_from_renewal;
  return client;
}

// Makes the rows of the clients of NFSv4, and of the addresses that have none.
class Rows {
 public:
  explicit Rows(const Sources& sources) : sources_(sources) {}

  std::vector<Row> Make() {
    for (const RecordedMount& mount : sources_.mounts) mounts_[mount.client].insert(mount.path);
    AddKernelClients();
    for (const Connection& connection : sources_.connections) {
      if (of_version4_.count({connection.address, connection.port}) == 0) connected_.insert(connection.address);
    }
    for (const auto& [client, paths] : mounts_) Add(client, "3", connected_.count(client) ? "connected" : "mounted");
    for (const std::string& address : connected_) AddUnknown(address, "connected");
    for (const std::string& address : sources_.served.refused) AddUnknown(address, "refused");
    for (const auto& [address, refused] : sources_.log->refused) AddUnknown(address, "refused");
    return std::move(rows_);
  }

 private:
  void AddKernelClients() {
    for (const KernelClient& kernel : sources_.clients) {
      of_version4_.insert({kernel.info.address, kernel.info.port});
      Add(Describe(kernel.info, kernel.number), &kernel);
    }
  }

  // An address without a client of NFSv4 and without a recorded mount. The further connections of a client of NFSv4
  // cannot be told from those of another one at its address.
  void AddUnknown(const std::string& address, const char* state) {
    if (addresses_.count(address) == 0) Add(address, "", state);
  }

  void Add(const std::string& client, const char* version, const char* state) {
    VORN::NFSClient row;
    const std::string order = OrderOf(client);
    (order[0] == '9' ? row.name : row.address) = ToValidUtf8(client);
    row.version = version;
    const auto admitted = sources_.log->admitted.find(client);
    if (row.version == "3" && admitted != sources_.log->admitted.end()) row.since = admitted->second;
    row.state = state;
    Add(std::move(row), nullptr);
  }

  void Add(VORN::NFSClient client, const KernelClient* kernel) {
    const std::string& address = client.address;
    addresses_.insert(address);
    const auto mounts = kernel == nullptr ? mounts_.find(address.empty() ? client.name : address) : mounts_.end();
    client.exports = ExportsOf(sources_, address, mounts == mounts_.end() ? no_mounts_ : mounts->second);
    client.refusals = RefusalsOf(sources_, address);
    std::string order = OrderOf(address);
    rows_.push_back({std::move(client), std::move(order), kernel});
  }

  const Sources& sources_;
  const std::set<std::string> no_mounts_;
  std::map<std::string, std::set<std::string>> mounts_;  // the recorded paths of a client
  std::set<std::pair<std::string, int>> of_version4_;    // the connections of clients of NFSv4
  std::set<std::string> connected_;                      // the addresses with other connections
  std::set<std::string> addresses_;                      // with a row
  std::vector<Row> rows_;
};

bool Matches(const CaselessSubstring& filter, const VORN::NFSClient& client) {
  const auto has_path = [&filter](const auto& item) { return filter.IsIn(item.path); };
  return filter.IsIn(client.address) || filter.IsIn(client.name) || filter.IsIn(client.version) ||
         std::any_of(client.exports.begin(), client.exports.end(), has_path) ||
         std::any_of(client.refusals.begin(), client.refusals.end(), has_path);
}

// Removes the rows that the filter does not match.
void RemoveOthers(const std::string& filter, std::vector<Row>* rows) {
  const CaselessSubstring wanted(filter);
  const auto is_other = [&wanted](const Row& row) { return !Matches(wanted, row.client); };
  rows->erase(std::remove_if(rows->begin(), rows->end(), is_other), rows->end());
}

void Complete(const KernelClients& kernel, Row* row) {
  if (row->kernel == nullptr) return;
  row->client.since = kernel.SinceOf(*row->kernel);
  const std::optional<ClientStates> states = kernel.StatesOf(*row->kernel);
  if (!states) return;
  row->client.open_files = states->open_files;
  row->client.locks = states->locks;
  row->client.delegations = states->delegations;
}

}  // namespace

Result<ClientPage> ListClients(Box& box, const MountLog& log, const std::string& filter, std::size_t offset,
                               std::size_t limit) {
  const Result<std::string> folder = box.root().Locate(kKernelClients);
  if (!folder.ok()) return folder.status();
  const KernelClients kernel(*folder);
  const Result<Sources> sources = ReadSources(box, kernel, log);
  if (!sources.ok()) return sources.status();
  std::vector<Row> rows = Rows(*sources).Make();
  if (!filter.empty()) RemoveOthers(filter, &rows);
  std::stable_sort(rows.begin(), rows.end(), [](const Row& a, const Row& b) { return a.order < b.order; });
  ClientPage page{{}, rows.size()};
  for (std::size_t at = std::min(offset, rows.size()); at < rows.size() && page.clients.size() < limit; ++at) {
    Complete(kernel, &rows[at]);
    page.clients.push_back(std::move(rows[at].client));
  }
  return page;
}

Result<std::vector<VORN::NFSClient>> ListClientsWithoutStates(Box& box) {
  const Result<std::string> folder = box.root().Locate(kKernelClients);
  if (!folder.ok()) return folder.status();
  const MountLog no_log;
  const Result<Sources> sources = ReadSources(box, KernelClients(*folder), no_log);
  if (!sources.ok()) return sources.status();
  std::vector<VORN::NFSClient> clients;
  for (Row& row : Rows(*sources).Make()) clients.push_back(std::move(row.client));
  return clients;
}

}  // namespace vorn

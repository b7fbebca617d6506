#include "touched_clients.h"

#include <algorithm>
#include <cstddef>
#include <map>
#include <optional>

#include "client_host.h"
#include "client_list.h"
#include "export_decision.h"
#include "exports_in_force.h"
#include "folder_path.h"
#include "host_names.h"
#include "mount_table.h"

namespace vorn {
namespace {

// A name service that does not answer.
NameService NoNames() {
  return {[](const std::string& /*host*/) { return std::nullopt; },
          [](const std::string& /*address*/) { return std::nullopt; },
          [](const std::string& /*netgroup*/, const std::string& /*host*/) { return false; }};
}

// The facts that all comparisons have in common.
struct Circumstances {
  ExportsInForce before;
  ExportsInForce after;
  std::set<std::string> mount_points;
  NameService names = NoNames();
};

Result<Circumstances> ReadCircumstances(Box& real, Box& draft) {
  Circumstances all;
  const Result<MountTable> mounts = MountTable::Read(real);
  if (!mounts.ok()) return mounts.status();
  const std::vector<std::string> points = mounts->FoldersBelow("/");
  all.mount_points = {points.begin(), points.end()};
  Result<ExportsInForce> before = ReadExportsInForce(real, all.names, false);
  if (!before.ok()) return before.status();
  Result<ExportsInForce> after = ReadExportsInForce(draft, all.names, false);
  if (!after.ok()) return after.status();
  all.before = std::move(*before);
  all.after = std::move(*after);
  return all;
}

// The exports of a box that may decide over a path, in their order.
class Rules {
 public:
  Rules(const Circumstances& all, const ExportsInForce& in_force, const std::string& path)
      : path_(path), all_(all), hosts_(in_force.hosts) {
    for (const TableExport& one : in_force.exports) {
      if (IsAtOrBelow(path, one.directory)) exports_.push_back(one);
    }
    needs_names_ = NeedsNames(exports_);
  }

  std::size_t size() const { return exports_.size(); }

  // Returns the options that the client gets; nullptr if no rule admits it. Clears `is_certain` if names are needed.
  const ExportOptions* OptionsOf(const VORN::NFSClient& client, bool* is_certain) {
    ClientHost host = FindClientHost(client.address, all_.names, needs_names_);
    const auto matches = [&](const TableExport& one) { return MatchesExport(&host, one, all_.names, &hosts_); };
    const ExportDecision decision = DecideExport(exports_, {path_, client.version != "3", all_.mount_points, matches});
    if (host.is_away) *is_certain = false;
    const bool is_admitted = decision.outcome == ExportDecision::Outcome::kRule && decision.decider;
    return is_admitted ? &exports_[*decision.decider].options : nullptr;
  }

 private:
  const std::string path_;
  const Circumstances& all_;
  HostAddresses hosts_;
  ExportList exports_;
  bool needs_names_ = false;
};

// The comparison of a path before and after the change.
class Comparison {
 public:
  Comparison(const Circumstances& all, const std::string& path)
      : path_(path), before_(all, all.before, path), after_(all, all.after, path) {}

  std::size_t cost() const { return before_.size() + after_.size(); }

  std::optional<TouchedClient> Compare(const VORN::NFSClient& client) {
    TouchedClient touched{client.address, client.name, client.version, path_, {}, true};
    const ExportOptions* before = before_.OptionsOf(client, &touched.is_certain);
    const ExportOptions* after = after_.OptionsOf(client, &touched.is_certain);
    touched.rights = CompareRights(before, after);
    if (touched.rights.empty()) return std::nullopt;
    return touched;
  }

 private:
  const std::string path_;
  Rules before_;
  Rules after_;
};

bool IsConcerned(const std::string& path, const std::set<std::string>& directories) {
  return std::any_of(directories.begin(), directories.end(),
                     [&path](const std::string& directory) { return IsAtOrBelow(path, directory); });
}

}  // namespace

Result<TouchedClients> FindTouchedClients(Box& real, Box& draft, const std::set<std::string>& directories,
                                          std::size_t most) {
  TouchedClients touched;
  const Result<std::vector<VORN::NFSClient>> clients = ListClientsWithoutStates(real);
  if (!clients.ok()) return clients.status();
  const Result<Circumstances> circumstances = ReadCircumstances(real, draft);
  if (!circumstances.ok()) return circumstances.status();
  std::map<std::string, Comparison> comparisons;  // by path
  std::size_t compared = 0;
  for (const VORN::NFSClient& client : *clients) {
    for (const VORN::ClientExport& used : client.exports) {
      if (client.address.empty() || !IsConcerned(used.path, directories)) continue;
      const auto found = comparisons.try_emplace(used.path, *circumstances, used.path).first;
      compared += found->second.cost();
      if (compared > most) {
        touched.is_complete = false;
        return touched;
      }
      if (auto one = found->second.Compare(client)) touched.clients.push_back(std::move(*one));
    }
  }
  return touched;
}

}  // namespace vorn

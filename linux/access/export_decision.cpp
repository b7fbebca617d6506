#include "export_decision.h"

#include <algorithm>

#include "folder_path.h"

namespace vorn {
namespace {

using Outcome = ExportDecision::Outcome;

class Decider {
 public:
  Decider(const ExportList& exports, const ExportQuestion& question) : exports_(exports), question_(question) {
    for (std::size_t index = 0; index < exports.size(); ++index) {
      const TableExport& one = exports[index];
      if (IsBelow(one.directory, question.directory)) {
        has_inner_ = has_inner_ || question.matches(one);
      } else if (IsAtOrBelow(question.directory, one.directory)) {
        if (question.matches(one)) matching_.push_back(index);
      }
    }
    const auto is_earlier = [&](std::size_t a, std::size_t b) { return exports[a].kind < exports[b].kind; };
    std::stable_sort(matching_.begin(), matching_.end(), is_earlier);
  }

  ExportDecision Decide() {
    ExportDecision decision = question_.is_version_4 ? Walk() : Mount();
    for (const std::size_t index : matching_) {
      if (index != decision.decider) decision.others.push_back({index, ReasonOf(index, decision.decider)});
    }
    return decision;
  }

 private:
  using Reason = ExportDecision::Other::Reason;

  // The first matching rule of a directory itself.
  std::optional<std::size_t> RuleOf(const std::string& directory) const {
    const auto found = std::find_if(matching_.begin(), matching_.end(),
                                    [&](std::size_t index) { return exports_[index].directory == directory; });
    return found == matching_.end() ? std::nullopt : std::optional(*found);
  }

  // The rule of a mount point: its own, else that of the nearest outer directory with "crossmnt".
  std::optional<std::size_t> RuleAcross(const std::string& mount_point) const {
    if (const auto own = RuleOf(mount_point)) return own;
    std::optional<std::size_t> nearest;
    for (const std::size_t index : matching_) {
      const TableExport& one = exports_[index];
      if (!one.options.crossmnt || !IsBelow(mount_point, one.directory)) continue;
      if (!nearest || one.directory.size() > exports_[*nearest].directory.size()) nearest = index;
    }
    return nearest;
  }

  bool IsMountPointBetween(const std::string& outer) const {
    return std::any_of(question_.mount_points.begin(), question_.mount_points.end(), [&](const std::string& point) {
      return IsBelow(point, outer) && IsAtOrBelow(question_.directory, point);
    });
  }

  ExportDecision Mount() const {
    const std::vector<std::string> way = WayTo(question_.directory);
    for (auto directory = way.rbegin(); directory != way.rend(); ++directory) {
      const std::optional<std::size_t> rule = RuleOf(*directory);
      if (!rule) continue;
      const bool is_allowed = exports_[*rule].options.crossmnt || !IsMountPointBetween(*directory);
      return {is_allowed ? Outcome::kRule : Outcome::kFolder, rule, {}};
    }
    return {};
  }

  ExportDecision Walk() const {
    std::optional<std::size_t> decider;
    for (const std::string& directory : WayTo(question_.directory)) {
      if (!decider) {
        decider = RuleOf(directory);
      } else if (question_.mount_points.count(directory) != 0) {
        const std::optional<std::size_t> rule = RuleAcross(directory);
        if (!rule) return {Outcome::kHidden, decider, {}};
        decider = rule;
      }
    }
    if (decider) return {Outcome::kRule, decider, {}};
    return {has_inner_ ? Outcome::kPassage : Outcome::kNone, std::nullopt, {}};
  }

  Reason ReasonOf(std::size_t index, const std::optional<std::size_t>& decider) const {
    if (!decider || exports_[index].directory != exports_[*decider].directory) return Reason::kDirectory;
    return exports_[index].kind == exports_[*decider].kind ? Reason::kOrder : Reason::kKind;
  }

  const ExportList& exports_;
  const ExportQuestion& question_;
  std::vector<std::size_t> matching_;  // on the way to the directory, by kind
  bool has_inner_ = false;             // whether a rule of a directory inside matches the client
};

}  // namespace

ExportKind ExportKindOf(const std::string& client) {
  if (client.empty() || client == "*") return ExportKind::kEverybody;
  if (client[0] == '@') return ExportKind::kNetgroup;
  const std::size_t sign = client.find_first_of("*?[/");
  if (sign == std::string::npos) return ExportKind::kHost;
  return client[sign] == '/' ? ExportKind::kNetwork : ExportKind::kPattern;
}

const char* NameOf(ExportKind kind) {
  switch (kind) {
    case ExportKind::kHost:
      return "host";
    case ExportKind::kNetwork:
      return "network";
    case ExportKind::kPattern:
      return "pattern";
    case ExportKind::kNetgroup:
      return "netgroup";
    case ExportKind::kEverybody:
      break;
  }
  return "everybody";
}

ExportDecision DecideExport(const ExportList& exports, const ExportQuestion& question) {
  return Decider(exports, question).Decide();
}

}  // namespace vorn

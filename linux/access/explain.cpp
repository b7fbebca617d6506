#include "explain.h"

#include <algorithm>
#include <cerrno>
#include <string>
#include <utility>

#include "client_host.h"
#include "export_decision.h"
#include "exports_in_force.h"
#include "kernel_statistics.h"
#include "mounts.h"
#include "shares.h"
#include "unicode.h"

namespace vorn {
namespace {

using Check = VORN::AccessCheck;
using CheckResult = VORN::AccessCheck::Result;
using Outcome = ExportDecision::Outcome;

constexpr int kFirstUnreservedPort = 1024;

struct KindText {
  const char* name;
  const char* text;
};

KindText TextOf(ExportKind kind) {
  switch (kind) {
    case ExportKind::kHost:
      return {"host", "a single host"};
    case ExportKind::kNetwork:
      return {"network", "a network"};
    case ExportKind::kPattern:
      return {"pattern", "a pattern of names"};
    case ExportKind::kNetgroup:
      return {"netgroup", "a netgroup"};
    case ExportKind::kEverybody:
      return {"everybody", "everybody"};
  }
  return {"", ""};
}

std::string Quoted(const std::string& text) { return "\"" + text + "\""; }

std::string Described(const TableExport& one) {
  std::string text = "The rule for " + Quoted(one.written) + " of " + one.directory;
  if (one.file.empty()) return text + ", which no exports file has,";
  return text + " (" + one.file + ", line " + std::to_string(one.line) + ")";
}

VORN::AccessRule RuleOf(const TableExport& one, const char* reason, const std::string& text) {
  VORN::AccessRule rule;
  rule.directory = ToValidUtf8(one.directory);
  rule.client = ToValidUtf8(one.written);
  rule.kind = TextOf(one.kind).name;
  rule.file = ToValidUtf8(one.file);
  rule.line = one.line;
  rule.reason = reason;
  rule.text = ToValidUtf8(text);
  return rule;
}

VORN::AccessRule OtherRule(const TableExport& one, const TableExport* decider, ExportDecision::Other::Reason reason) {
  const std::string described = Described(one);
  switch (reason) {
    case ExportDecision::Other::Reason::kKind:
      return RuleOf(one, "kind",
                    described + " is for " + TextOf(one.kind).text + "; a rule for " + TextOf(decider->kind).text +
                        " comes first, whatever the order in the file.");
    case ExportDecision::Other::Reason::kOrder:
      return RuleOf(one, "order", described + " is of the same kind and stands after the rule that decides.");
    case ExportDecision::Other::Reason::kDirectory:
      break;
  }
  const std::string why =
      decider == nullptr ? " does not open this folder." : " loses to a rule of " + decider->directory + ".";
  return RuleOf(one, "directory", described + why);
}

// Answers one question.
class Explanation {
 public:
  Explanation(const VORN::AccessQuestion& question, std::string path, const ExportsInForce& in_force, ClientHost client)
      : question_(question), path_(std::move(path)), in_force_(in_force), client_(std::move(client)) {}

  VORN::AccessAnswer Answer(const NameService& names, std::set<std::string> mount_points) {
    answer_.path = ToValidUtf8(path_);
    HostAddresses hosts = in_force_.hosts;
    const auto matches = [&](const TableExport& one) { return MatchesExport(&client_, one, names, &hosts); };
    decision_ = DecideExport(in_force_.exports, {path_, question_.version != "3", std::move(mount_points), matches});
    answer_.addresses = client_.addresses;
    answer_.names = client_.names;
    AddRules();
    CheckName();
    CheckRule();
    if (decider() != nullptr) {
      CheckFlavor();
      CheckPort();
    }
    Conclude();
    return std::move(answer_);
  }

 private:
  const TableExport* decider() const { return decision_.decider ? &in_force_.exports[*decision_.decider] : nullptr; }

  void Add(const char* check, CheckResult result, const std::string& text, const std::string& remedy = "") {
    answer_.checks.push_back({check, result, ToValidUtf8(text), ToValidUtf8(remedy)});
  }

  void AddRules() {
    if (decider() != nullptr) {
      answer_.rule = RuleOf(*decider(), "decides", Described(*decider()) + " decides.");
    }
    for (const ExportDecision::Other& other : decision_.others) {
      answer_.others.push_back(OtherRule(in_force_.exports[other.index], decider(), other.reason));
    }
  }

  void CheckName() {
    if (client_.is_away || in_force_.is_name_service_away) {
      return Add(
          "name", CheckResult::kUnknown,
          "The name service did not answer, so that rules for host names, patterns and netgroups may be missing.");
    }
    if (!client_.addresses.empty()) {
      return Add("name", CheckResult::kPassed, "The client has the address " + client_.addresses.front() + ".");
    }
    Add("name", CheckResult::kFailed, "The name service has no address for " + Quoted(question_.client) + ".",
        "Enter the host in the name service or in /etc/hosts of the box.");
  }

  void CheckRule() {
    if (in_force_.pending.count(path_) != 0) {
      Add("reload", CheckResult::kFailed, "The exports files have other rules for " + path_ + " than those in force.",
          "Reload the NFS service.");
    }
    switch (decision_.outcome) {
      case Outcome::kRule:
        return Add("rule", CheckResult::kPassed, answer_.rule->text);
      case Outcome::kNone:
        return Add("rule", CheckResult::kFailed,
                   "No export rule of " + path_ +
                       " or of a folder around it is for this "
                       "client.",
                   "Add a rule for the client.");
      case Outcome::kPassage:
        return Add("rule", CheckResult::kFailed,
                   "Only folders inside of " + path_ +
                       " are exported to this client. "
                       "NFSv4 shows it as the way to them.",
                   "Add a rule for the client.");
      case Outcome::kHidden:
        return Add("rule", CheckResult::kFailed,
                   "Another file system is mounted on the way to " + path_ + ", and no rule opens it to this client.",
                   "Add a rule for the client to this share.");
      case Outcome::kFolder:
        return Add("rule", CheckResult::kFailed,
                   Described(*decider()) +
                       " is for another file system and has no "
                       "\"crossmnt\".",
                   "Add a rule for the client to this share.");
    }
  }

  const ExportFlavor* Flavor() const {
    const std::vector<ExportFlavor>& flavors = decider()->options.flavors;
    const auto found = std::find_if(flavors.begin(), flavors.end(),
                                    [&](const ExportFlavor& flavor) { return flavor.name == question_.flavor; });
    return found == flavors.end() ? nullptr : &*found;
  }

  void CheckFlavor() {
    if (Flavor() != nullptr) {
      return Add("flavor", CheckResult::kPassed, "The rule accepts the security flavour " + question_.flavor + ".");
    }
    std::string accepted;
    for (const ExportFlavor& flavor : decider()->options.flavors)
      accepted += (accepted.empty() ? "" : ", ") + flavor.name;
    Add("flavor", CheckResult::kFailed,
        "The rule does not accept the security flavour " + question_.flavor + ", but " + accepted + ".",
        "Mount with another flavour, or add " + question_.flavor + " to the rule.");
  }

  // rpc.mountd(8) looks at the port of every version 3 client, nfsd at that of those without Kerberos. mountd takes the
  // option that stands last in the table.
  bool NeedsReservedPort() const {
    if (question_.version == "3" && !decider()->options.flavors.back().access.insecure) return true;
    return question_.flavor == "sys" && Flavor() != nullptr && !Flavor()->access.insecure;
  }

  void CheckPort() {
    if (question_.port < kFirstUnreservedPort) {
      return Add("port", CheckResult::kPassed, "The client uses a reserved port.");
    }
    const std::string port = std::to_string(question_.port);
    if (!NeedsReservedPort()) {
      return Add("port", CheckResult::kPassed, "The rule accepts the port " + port + ".");
    }
    Add("port", CheckResult::kFailed,
        "The rule accepts ports below 1024 only (\"secure\"); the client uses " + port + ".",
        "Mount from a reserved port, or accept other ports (\"insecure\").");
  }

  void Conclude() {
    const bool is_open = std::none_of(answer_.checks.begin(), answer_.checks.end(), [](const Check& check) {
      return check.result == CheckResult::kFailed && check.check != "reload";
    });
    answer_.mountable = is_open && decision_.outcome == Outcome::kRule;
    answer_.read = answer_.mountable;
    answer_.write = answer_.mountable && !Flavor()->access.read_only;
  }

  const VORN::AccessQuestion& question_;
  const std::string path_;
  const ExportsInForce& in_force_;
  ClientHost client_;
  ExportDecision decision_;
  VORN::AccessAnswer answer_;
};

bool NeedsNames(const ExportList& exports) {
  return std::any_of(exports.begin(), exports.end(), [](const TableExport& one) {
    return one.kind == ExportKind::kPattern || one.kind == ExportKind::kNetgroup;
  });
}

bool IsServing(Box& box) {
  const Result<StoredFile> file = box.Read(kKernelStatistics);
  return file.ok() && file->version.exists && ParseKernelStatistics(file->text).threads > 0;
}

}  // namespace

Result<VORN::AccessAnswer> ExplainAccess(Box& box, const NameService& names, const VORN::AccessQuestion& question) {
  Result<std::string> path = FindSharePath(box, question.share);
  if (!path.ok()) return path.status();
  const Result<ExportsInForce> in_force = ReadExportsInForce(box, names, IsServing(box));
  if (!in_force.ok()) return in_force.status();
  const Result<std::vector<std::string>> mounts = MountsBelow(box, "/");
  if (!mounts.ok()) return mounts.status();
  ClientHost client = FindClientHost(question.client, names, NeedsNames(in_force->exports));
  Explanation explanation(question, std::move(*path), *in_force, std::move(client));
  return explanation.Answer(names, {mounts->begin(), mounts->end()});
}

}  // namespace vorn

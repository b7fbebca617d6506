#include "explain.h"

#include <algorithm>
#include <optional>
#include <utility>

#include "client_identity.h"
#include "folder_path.h"
#include "folder_permissions.h"
#include "keytab.h"
#include "service_checks.h"
#include "shares.h"
#include "unicode.h"

namespace vorn {
namespace {

using Outcome = ExportDecision::Outcome;

constexpr int kFirstUnreservedPort = 1024;
constexpr std::uint32_t kNobody = 65534;
constexpr unsigned kList = 4;  // the permission bits of a folder
constexpr unsigned kChange = 2;
constexpr unsigned kEnter = 1;

const char* TextOf(ExportKind kind) {
  switch (kind) {
    case ExportKind::kHost:
      return "a single host";
    case ExportKind::kNetwork:
      return "a network";
    case ExportKind::kPattern:
      return "a pattern of names";
    case ExportKind::kNetgroup:
      return "a netgroup";
    case ExportKind::kEverybody:
      return "everybody";
  }
  return "";
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
  rule.kind = NameOf(one.kind);
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
                    described + " is for " + TextOf(one.kind) + "; a rule for " + TextOf(decider->kind) +
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

// mountd does not ask for the addresses of a client's name.
std::string UnconfirmedName(const ClientHost& client) {
  if (client.is_name_confirmed) return "";
  return " Its name " + Quoted(client.names.front()) +
         " does not lead back to this address; rpc.mountd takes it all the same for rules of patterns and netgroups.";
}

}  // namespace

// Answers one question.
class Explanation {
 public:
  // `checks` are those of the service.
  Explanation(Explainer& explainer, const VORN::AccessQuestion& question, const std::string& path, AccessChecks checks)
      : explainer_(explainer),
        question_(question),
        path_(path),
        exports_(explainer.ExportsAround(path)),
        checks_(std::move(checks)) {}

  Result<VORN::AccessAnswer> Answer(ClientHost client) {
    const auto matches = [&](const TableExport& one) { return explainer_.Matches(&client, one); };
    decision_ = DecideExport(exports_, {path_, question_.version != "3", explainer_.mount_points_, matches});
    if (decision_.decider) decider_ = &exports_[*decision_.decider];
    AddRules();
    CheckName(client);
    if (decider_ != nullptr) CheckMount();
    if (question_.version != "3" && decision_.outcome != Outcome::kNone) CheckWay();
    // NFSv4 lets a client mount a folder that is only the way to exports inside it, and shows nothing else there.
    const bool is_open = decision_.outcome == Outcome::kRule || decision_.outcome == Outcome::kPassage;
    answer_.mountable = is_open && !checks_.HasFailed();
    CheckRule();
    if (decider_ != nullptr) AddDoubts();
    if (Status status = CheckFolder(); !status.ok()) return status;
    answer_.path = ToValidUtf8(path_);
    answer_.addresses = std::move(client.addresses);
    for (const std::string& name : client.names) answer_.names.push_back(ToValidUtf8(name));
    CheckReload();  // not a condition: the table in force decides
    answer_.checks = checks_.list();
    return std::move(answer_);
  }

 private:
  void AddRules() {
    if (decider_ != nullptr) answer_.rule = RuleOf(*decider_, "decides", Described(*decider_) + " decides.");
    for (const ExportDecision::Other& other : decision_.others) {
      answer_.others.push_back(OtherRule(exports_[other.index], decider_, other.reason));
    }
  }

  void CheckName(const ClientHost& client) {
    if (client.is_away || explainer_.in_force_.is_name_service_away) {
      checks_.Doubt("name",
                    "The name service did not answer. Rules for host names, patterns and netgroups may be missing.");
    } else if (client.addresses.empty()) {
      checks_.Fail("name", "The name service has no address for " + Quoted(question_.client) + ".",
                   "Enter the host in the name service, or in /etc/hosts of the box.");
    } else {
      checks_.Pass("name", "The client has the address " + client.addresses.front() + "." + UnconfirmedName(client));
    }
  }

  void CheckReload() {
    if (explainer_.in_force_.pending.count(path_) == 0) return;
    checks_.Fail("reload", "The exports files have other rules for " + path_ + " than those in force.",
                 "Reload the NFS service.");
  }

  void CheckRule() {
    switch (decision_.outcome) {
      case Outcome::kRule:
        return checks_.Pass("rule", answer_.rule->text);
      case Outcome::kNone:
        return checks_.Fail("rule", "No export rule of " + path_ + " or of a folder around it is for this client.",
                            "Add a rule for the client.");
      case Outcome::kPassage:
        return checks_.Fail("rule",
                            "Only folders inside of " + path_ + " are exported to this client; NFSv4 shows " + path_ +
                                " as the way to them.",
                            "Add a rule for the client.");
      case Outcome::kHidden:
        return checks_.Fail(
            "rule", "Another file system is mounted on the way to " + path_ + ", and no rule opens it to this client.",
            "Add a rule for the client to this share.");
      case Outcome::kFolder:
        return checks_.Fail("rule", Described(*decider_) + " is for another file system and has no \"crossmnt\".",
                            "Add a rule for the client to this share.");
    }
  }

  // The conditions of a mount besides the rule itself.
  void CheckMount() {
    const std::vector<ExportFlavor>& flavors = decider_->options.flavors;
    const auto found = std::find_if(flavors.begin(), flavors.end(),
                                    [&](const ExportFlavor& flavor) { return flavor.name == question_.flavor; });
    if (found != flavors.end()) access_ = found->access;
    CheckFlavor();
    CheckPort();
    CheckKeytab();
  }

  void CheckFlavor() {
    if (access_) {
      return checks_.Pass("flavor", "The rule accepts the security flavour " + question_.flavor + ".");
    }
    std::string accepted;
    for (const ExportFlavor& flavor : decider_->options.flavors) {
      accepted += (accepted.empty() ? "" : ", ") + flavor.name;
    }
    checks_.Fail("flavor", "The rule accepts " + accepted + " and not the security flavour " + question_.flavor + ".",
                 "Mount with another flavour, or add " + question_.flavor + " to the rule.");
  }

  // rpc.mountd(8) looks at the port of every version 3 client, nfsd at that of those without Kerberos. mountd takes the
  // option that stands last in the table.
  bool NeedsReservedPort() const {
    if (question_.version == "3" && !decider_->options.flavors.back().access.insecure) return true;
    return question_.flavor == "sys" && access_ && !access_->insecure;
  }

  void CheckPort() {
    if (question_.port < kFirstUnreservedPort) return checks_.Pass("port", "The client uses a reserved port.");
    const std::string port = std::to_string(question_.port);
    if (!NeedsReservedPort()) return checks_.Pass("port", "The rule accepts the port " + port + ".");
    checks_.Fail("port", "The rule accepts ports below 1024 only (\"secure\"); the client uses " + port + ".",
                 "Mount from a reserved port, or accept other ports (\"insecure\").");
  }

  void CheckKeytab() {
    if (question_.flavor == "sys" || explainer_.box_->Exists(kKeytabFile)) return;
    checks_.Fail("keytab", "The box has no keytab, so no client can use Kerberos.", "Upload a keytab.");
  }

  // Over version 4 the root user of the client walks to the folder. It remains root in the folders above the rule's
  // one, except that Kerberos makes it nobody. The options of the rule count for the folders below.
  void CheckWay() {
    VORN::AccessIdentity root;
    if (question_.flavor != "sys") root.user_id = root.group_id = kNobody;
    for (const std::string& folder : WayTo(path_)) {
      if (folder == path_) break;
      const bool is_in_rule = decider_ != nullptr && folder.size() >= decider_->directory.size();
      if (is_in_rule && access_) root = Squash({}, *access_, *decider_);
      const Result<FolderPermissions> permissions = ReadFolderPermissions(*explainer_.box_, folder);
      if (!permissions.ok() || permissions->Of(root, kEnter) == kEnter) continue;
      return checks_.Fail("way",
                          "The folder " + folder + " may not be entered by the user " + std::to_string(root.user_id) +
                              ", as whom the client's root user walks to the share.",
                          "Let others enter " + folder + ", or mount with version 3.");
    }
  }

  // Names what may decide otherwise and cannot be seen, or is not compared here.
  void AddDoubts() {
    if (question_.flavor != "sys") {
      checks_.Doubt("ticket", "Only the KDC knows whether the client and its user get a ticket for this box.");
    }
    if (question_.version != "3") CheckRoot();
    const std::vector<std::string> inner = explainer_.mounts_.FoldersBelow(path_);
    if (inner.empty()) return;
    checks_.Doubt("volume", "A file system is mounted at " + inner.front() +
                                ": its own rules, and \"crossmnt\" of this one, decide over what is in it.");
  }

  // A client of version 4 sees nothing but what is inside of the export with "fsid=0", and names paths from there.
  void CheckRoot() {
    const ExportList& exports = explainer_.in_force_.exports;
    const auto root = std::find_if(exports.begin(), exports.end(), [](const TableExport& one) {
      const std::vector<std::string>& words = one.options.others;
      return std::any_of(words.begin(), words.end(),
                         [](const std::string& word) { return word == "fsid=0" || word == "fsid=root"; });
    });
    if (root == exports.end()) return;
    checks_.Doubt("root", root->directory + " is the root of version 4 for " + Quoted(root->written) +
                              " (fsid=0): such a client names paths from there, and reaches no other folder. This is "
                              "not taken into account here.");
  }

  // Checks the rights of the user in the folder itself.
  Status CheckFolder() {
    std::optional<ClientIDs> ids;
    if (!question_.user.empty()) {
      Result<ClientIDs> found = FindClientIDs(*explainer_.box_, question_);
      if (!found.ok()) return found.status();
      ids = std::move(*found);
    }
    if (decision_.outcome != Outcome::kRule || !access_) return {};
    const Result<FolderPermissions> folder = ReadFolderPermissions(*explainer_.box_, path_);
    if (!folder.ok()) {
      checks_.Fail("folder", folder.status().reason(), "Create the folder, or mount its file system.");
      answer_.mountable = false;
      return {};
    }
    if (ids && ids->is_refused) {
      for (const char* check : {"read", "write"}) checks_.Fail(check, ids->identity.text, "Correct the mapping.");
      return {};
    }
    if (ids) SetIdentity(Squash(*ids, *access_, *decider_));
    CheckPermission("read", kList | kEnter, "list", *folder);
    CheckWrite(*folder);
    answer_.read = answer_.mountable && !checks_.HasFailed("read");
    answer_.write = answer_.mountable && !checks_.HasFailed("write");
    return {};
  }

  void SetIdentity(VORN::AccessIdentity identity) {
    identity.text = ToValidUtf8(identity.text);
    identity.file = ToValidUtf8(identity.file);
    answer_.identity = std::move(identity);
  }

  void CheckWrite(const FolderPermissions& folder) {
    if (access_->read_only) {
      checks_.Fail("write", "The rule is read-only.", "Give the rule the privilege to write.");
    } else if (explainer_.mounts_.IsReadOnly(path_)) {
      checks_.Fail("write", "The file system of " + path_ + " is mounted read-only.", "Mount it for writing.");
    } else {
      CheckPermission("write", kChange | kEnter, "change", folder);
    }
  }

  void CheckPermission(const char* check, unsigned wanted, const char* what, const FolderPermissions& folder) {
    if (!answer_.identity) return;
    const std::string user = "The user " + std::to_string(answer_.identity->user_id);
    const std::string permission = std::string(" may ") + what + " the folder " + path_ + ".";
    if (folder.Of(*answer_.identity, wanted) == wanted) return checks_.Pass(check, user + permission);
    checks_.Fail(check,
                 "By its UNIX permissions, the user " + std::to_string(answer_.identity->user_id) + " may not " + what +
                     " the folder " + path_ + ".",
                 "Change the owner or the permissions of the folder, or the user as whom the server acts.");
  }

  Explainer& explainer_;
  const VORN::AccessQuestion& question_;
  const std::string& path_;
  const ExportList& exports_;
  ExportDecision decision_;
  const TableExport* decider_ = nullptr;
  std::optional<ExportAccess> access_;  // of the flavour of the question
  AccessChecks checks_;
  VORN::AccessAnswer answer_;
};

Explainer::Explainer(Box& box, const NameService& names, ExportsInForce in_force, MountTable mounts)
    : box_(&box),
      names_(names),
      in_force_(std::move(in_force)),
      hosts_(in_force_.hosts),
      mounts_(std::move(mounts)),
      needs_names_(NeedsNames(in_force_.exports)) {
  const std::vector<std::string> points = mounts_.FoldersBelow("/");
  mount_points_ = {points.begin(), points.end()};
  for (std::size_t at = 0; at < in_force_.exports.size(); ++at) {
    by_directory_[in_force_.exports[at].directory].push_back(at);
  }
}

Result<Explainer> Explainer::Open(Box& box, const NameService& names) {
  Result<ExportsInForce> in_force = ReadExportsInForce(box, names, IsServing(box));
  if (!in_force.ok()) return in_force.status();
  Result<MountTable> mounts = MountTable::Read(box);
  if (!mounts.ok()) return mounts.status();
  return Explainer(box, names, std::move(*in_force), std::move(*mounts));
}

const ExportList& Explainer::ExportsAround(const std::string& directory) {
  const auto [around, is_new] = around_.try_emplace(directory);
  if (!is_new) return around->second;
  std::vector<std::size_t> indexes;
  const auto add = [&indexes](const std::vector<std::size_t>& of) {
    indexes.insert(indexes.end(), of.begin(), of.end());
  };
  for (const std::string& folder : WayTo(directory)) {
    if (const auto found = by_directory_.find(folder); found != by_directory_.end()) add(found->second);
  }
  for (auto inner = by_directory_.upper_bound(directory == "/" ? directory : directory + "/");
       inner != by_directory_.end() && IsBelow(inner->first, directory); ++inner) {
    add(inner->second);
  }
  std::sort(indexes.begin(), indexes.end());
  for (const std::size_t index : indexes) around->second.push_back(in_force_.exports[index]);
  return around->second;
}

Result<AccessChecks> Explainer::ServiceChecks(const std::string& version) {
  const auto known = service_checks_.find(version);
  if (known != service_checks_.end()) return known->second;
  AccessChecks checks;
  if (Status status = CheckService(*box_, version, &checks); !status.ok()) return status;
  service_checks_.emplace(version, checks);
  return checks;
}

Result<VORN::AccessAnswer> Explainer::Explain(const VORN::AccessQuestion& question, const std::string& path,
                                              ClientHost client) {
  Result<AccessChecks> checks = ServiceChecks(question.version);
  if (!checks.ok()) return checks.status();
  return Explanation(*this, question, path, std::move(*checks)).Answer(std::move(client));
}

Result<std::vector<VORN::AccessAnswer>> ExplainAccesses(Box& box, const NameService& names,
                                                        const VORN::AccessQuestion& question,
                                                        const std::vector<std::string>& shares) {
  Result<Explainer> explainer = Explainer::Open(box, names);
  if (!explainer.ok()) return explainer.status();
  const ClientHost client = explainer->FindClient(question.client);
  std::vector<VORN::AccessAnswer> answers;
  for (const std::string& share : shares) {
    const Result<std::string> path = FindSharePath(box, share);
    if (!path.ok()) return path.status();
    Result<VORN::AccessAnswer> answer = explainer->Explain(question, *path, client);
    if (!answer.ok()) return answer.status();
    answers.push_back(std::move(*answer));
  }
  return answers;
}

}  // namespace vorn

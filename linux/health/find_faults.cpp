#include "find_faults.h"

#include <algorithm>
#include <array>
#include <iterator>
#include <map>
#include <utility>

#include "call.h"
#include "certificate_findings.h"
#include "export_findings.h"
#include "findings.h"
#include "health_input.h"
#include "kerberos_findings.h"
#include "mapping_findings.h"
#include "name_findings.h"
#include "rule_findings.h"
#include "service_findings.h"
#include "setting_findings.h"
#include "unicode.h"

namespace vorn {
namespace {

// One check, and the parts of the input without which it cannot be made.
struct Check {
  const char* kind;
  Status (*find)(const HealthInput& input, Findings* findings);
  bool needs_exports = false;
  bool needs_shares = false;
  bool depends_on_service = false;  // compares with the running service, or with what it finds
};

// In the order of a report: the service, its settings, the shares and their rules, users, Kerberos, the web API.
constexpr Check kChecks[] = {
    {"not_serving", FindStoppedService, false, false, true},
    {"closed_port", FindClosedPorts, false, false, true},
    {"full_file_system", FindFullFileSystems, false, true, true},
    {"exports_not_in_force", FindExportsNotInForce, true, false, true},
    {"exports_fault", FindExportFaults, true, false},
    {"settings_fault", FindSettingFaults},
    {"ignored_setting", FindIgnoredSettings},
    {"overridden_setting", FindOverriddenSettings},
    {"version_not_in_force", FindVersionsNotInForce, false, false, true},
    {"unknown_host", FindUnknownHosts, true, false, true},
    {"moved_host", FindMovedHosts, true, false},
    {"missing_folder", FindMissingFolders, false, true},
    {"left_share", FindExportsOfLeftShares, true, true},
    {"foreign_export", FindForeignExports, true, true},
    {"linked_export", FindLinkedExports, true, true},
    {"narrow_network", FindNarrowNetworks, true, false},
    {"hidden_rule", FindHiddenRules, true, false},
    {"crossed_volume", FindCrossedVolumes, true, false},
    {"nested_share", FindNestedShares, true, true},
    {"shared_file_system", FindSharedFileSystems, true, true},
    {"mapping_to_nobody", FindMappingsToNobody},
    {"mapping_to_root", FindMappingsToRoot},
    {"mapping_without_effect", FindMappingsWithoutEffect},
    {"missing_keytab", FindMissingKeytab, true, false},
    {"missing_host_key", FindMissingHostKey},
    {"weak_key", FindWeakKeys},
    {"outdated_key", FindOutdatedKeys, false, false, true},
    {"refused_ticket", FindRefusedTickets, false, false, true},
    {"unsynchronised_clock", FindUnsynchronisedClock},
    {"clock_skew", FindClockSkew, false, false, true},
    {"foreign_domain", FindForeignDomains, true, false, true},
    {"expiring_certificate", FindExpiringCertificate},
};

Status Run(const Check& check, const HealthInput& input, Findings* findings) {
  if (check.needs_exports && !input.exports_status.ok()) return input.exports_status;
  if (check.needs_shares && !input.shares_status.ok()) return input.shares_status;
  return check.find(input, findings);
}

void MakeValid(VORN::HealthFinding* finding) {
  VORN::HealthSubject& subject = finding->subject;
  for (std::string* text : {&subject.share, &subject.client, &subject.file, &subject.setting, &subject.mapping,
                            &finding->text, &finding->remedy}) {
    *text = ToValidUtf8(*text);
  }
  for (auto& [name, value] : finding->call.parameters) {
    if (std::string* text = std::get_if<std::string>(&value)) *text = ToValidUtf8(*text);
  }
}

VORN::HealthReport RunChecks(Box& box, bool with_service) {
  const HealthInput input(box);
  VORN::HealthReport report;
  for (const Check& check : kChecks) {
    if (check.depends_on_service && !with_service) continue;
    Findings findings(check.kind);
    const Status status = Run(check, input, &findings);
    if (!status.ok()) report.not_checked.push_back({check.kind, ToValidUtf8(status.reason())});
    std::vector<VORN::HealthFinding> found = findings.Take();
    std::move(found.begin(), found.end(), std::back_inserter(report.findings));
  }
  for (VORN::HealthFinding& finding : report.findings) MakeValid(&finding);
  std::stable_sort(report.findings.begin(), report.findings.end(),
                   [](const auto& a, const auto& b) { return a.severity < b.severity; });
  return report;
}

// The object of a finding without the number of its line.
using Identity = std::array<std::string, 6>;

Identity IdentityOf(const VORN::HealthFinding& finding) {
  const VORN::HealthSubject& subject = finding.subject;
  return {finding.kind, subject.share, subject.client, subject.file, subject.setting, subject.mapping};
}

}  // namespace

VORN::HealthReport FindFaults(Box& box) { return RunChecks(box, !box.is_draft()); }

VORN::HealthReport FindFaultsOfFiles(Box& box) { return RunChecks(box, false); }

std::vector<VORN::HealthFinding> FindAdded(const std::vector<VORN::HealthFinding>& before,
                                           const std::vector<VORN::HealthFinding>& now) {
  std::map<Identity, int> known;
  for (const VORN::HealthFinding& finding : before) ++known[IdentityOf(finding)];
  std::vector<VORN::HealthFinding> added;
  for (const VORN::HealthFinding& finding : now) {
    if (known[IdentityOf(finding)]-- <= 0) added.push_back(finding);
  }
  return added;
}

std::vector<std::string> KindsOfFaults() {
  std::vector<std::string> kinds;
  for (const Check& check : kChecks) kinds.emplace_back(check.kind);
  return kinds;
}

}  // namespace vorn

#include "kerberos_findings.h"

#include <sys/timex.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "ascii.h"
#include "host_domain.h"
#include "host_names.h"
#include "idmap.h"
#include "kdc_question.h"
#include "kernel_clients.h"
#include "keytab.h"

namespace vorn {
namespace {

constexpr char kHostName[] = "/etc/hostname";
constexpr long kMostSkew = 300;  // seconds; the default of "clockskew" in krb5.conf(5)
constexpr char kSynchronised[] = "/run/systemd/timesync/synchronized";  // systemd-timesyncd.service(8)
constexpr char kHosts[] = "/etc/hosts";

VORN::HealthSubject OfKeytab() {
  VORN::HealthSubject subject;
  subject.file = kKeytabFile;
  return subject;
}

// The first rule that accepts Kerberos; null if there is none.
const ExportedLine* FindKerberosRule(const HealthInput& input) {
  const auto uses_kerberos = [](const ExportFlavor& flavor) { return flavor.name.compare(0, 4, "krb5") == 0; };
  for (const ExportedLine& exported : input.exported) {
    for (const ExportEntry& entry : exported.line->entries) {
      const auto& flavors = entry.options.flavors;
      if (std::any_of(flavors.begin(), flavors.end(), uses_kerberos)) return &exported;
    }
  }
  return nullptr;
}

// The name that the box gives itself: of a trial root that in its own file.
Result<std::string> OwnName(Box& box) {
  char name[HOST_NAME_MAX + 1] = "";
  if (box.root().is_box()) return std::string(gethostname(name, sizeof name - 1) == 0 ? name : "");
  const Result<StoredFile> file = box.Read(kHostName);
  if (!file.ok()) return file.status();
  return file->text.substr(0, file->text.find_first_of(" \t\n"));
}

// The full name of the host, in lower case.
Result<std::string> FullName(Box& box) {
  const Result<std::string> own = OwnName(box);
  if (!own.ok()) return own.status();
  const Result<StoredFile> hosts = box.Read(kHosts);
  if (!hosts.ok()) return hosts.status();
  std::string name = CanonicalName(hosts->text, *own);
  if (name.find('.') != std::string::npos) return LowerAscii(name);
  return Status::Failure(kUnsupported,
                         "The host's full name is not in /etc/hosts, and the name service is not asked for it.");
}

// The NFSv4 domain of the box, in lower case.
Result<std::string> OwnDomain(Box& box) {
  const Result<std::shared_ptr<const IDMap>> map = ReadIDMap(box);
  if (!map.ok()) return map.status();
  if ((*map)->domain()) return LowerAscii(*(*map)->domain());
  const Result<std::string> name = FullName(box);
  if (!name.ok()) return name.status();
  return name->substr(name->find('.') + 1);
}

// The DNS domain in the name by which a Linux client calls itself, in lower case: "Linux NFSv4.2 c.example.net", also
// with "/..." behind the host name. Empty for all other names.
std::string DomainOfClient(const std::string& name) {
  constexpr std::string_view kLinux = "Linux NFSv4.";
  if (name.compare(0, kLinux.size(), kLinux) != 0) return "";
  const std::size_t begin = name.find(' ', kLinux.size());
  if (begin == std::string::npos) return "";
  const std::string host = name.substr(begin + 1, name.find_first_of(" /", begin + 1) - begin - 1);
  const std::size_t dot = host.find('.');
  if (dot == std::string::npos || HostAddress(host)) return "";
  return LowerAscii(host.substr(dot + 1));
}

bool IsWeak(const std::string& type) {
  const auto begins = [&](const char* prefix) { return type.rfind(prefix, 0) == 0; };
  return begins("des-") || begins("des3-") || begins("arcfour-");
}

// Returns what the KDC says about the keytab. The list is empty if there is nothing to ask about.
Result<std::vector<KdcAnswer>> AnswersOfKdc(Box& box) {
  const Result<std::vector<KeytabKey>> keys = ListKeytab(box, kKeytabFile);
  if (!keys.ok()) return keys.status();
  if (keys->empty()) return std::vector<KdcAnswer>();
  std::optional<KdcQuestion::Answers> answers = AskedKdc(box);
  if (answers) return std::move(*answers);
  return Status::Failure(kUnsupported, "The KDC is being asked; a later check has its answer.");
}

void JudgeKey(const KdcAnswer& answer, Findings* findings) {
  std::string text;
  if (answer.state == KdcAnswer::State::kOutdated) {
    text = "The KDC has another key of " + answer.principal + " than the keytab";
    if (!answer.detail.empty()) text += " (" + answer.detail + ")";
    text += ": clients cannot mount with Kerberos, or only until their tickets expire.";
    findings->Error(OfKeytab(), std::move(text),
                    "Export the present keys of " + answer.principal +
                        " from the KDC, and upload the new keytab (VORN.Core.FileServ.NFS.Kerberos, upload_key).");
  } else if (answer.state == KdcAnswer::State::kUnknown) {
    text =
        "The KDC does not know " + answer.principal + ", of which the keytab has a key: clients get no ticket for it.";
    findings->Warning(OfKeytab(), std::move(text),
                      "Make the principal at the KDC and upload a new keytab, or remove its keys from the keytab.");
  }
}

}  // namespace

Status FindMissingKeytab(const HealthInput& input, Findings* findings) {
  const ExportedLine* const rule = FindKerberosRule(input);
  if (rule == nullptr) return {};
  const Result<std::vector<KeytabKey>> keys = ListKeytab(input.box, kKeytabFile);
  if (!keys.ok() && keys.status().code() != kNoKeytab) return keys.status();
  if (keys.ok() && !keys->empty()) return {};
  const std::string state = keys.ok() ? " has no key" : " is no keytab";
  findings->Error(rule->Subject(),
                  rule->Name() + " demands Kerberos for " + rule->Exported() + ", and " + kKeytabFile + state +
                      ": clients cannot mount with Kerberos.",
                  "Upload a keytab with keys of nfs/HOST (VORN.Core.FileServ.NFS.Kerberos, upload_key).");
  return {};
}

Status FindMissingHostKey(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KeytabKey>> keys = ListKeytab(input.box, kKeytabFile);
  if (!keys.ok()) return keys.status();
  if (keys->empty()) return {};
  const Result<std::string> host = FullName(input.box);
  if (!host.ok()) return host.status();
  const std::string wanted = "nfs/" + *host + "@";
  for (const KeytabKey& key : *keys) {
    if (LowerAscii(key.principal).compare(0, wanted.size(), wanted) == 0) return {};
  }
  findings->Error(OfKeytab(),
                  "The keytab has no key of nfs/" + *host +
                      ", for which clients that mount from this name get a ticket: "
                      "they cannot mount with Kerberos.",
                  "Upload a keytab with keys of nfs/" + *host + " (VORN.Core.FileServ.NFS.Kerberos, upload_key).");
  return {};
}

Status FindWeakKeys(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KeytabKey>> keys = ListKeytab(input.box, kKeytabFile);
  if (!keys.ok()) return keys.status();
  std::set<std::pair<std::string, std::string>> weak;
  for (const KeytabKey& key : *keys) {
    if (IsWeak(key.enc_type)) weak.emplace(key.principal, key.enc_type);
  }
  for (const auto& [principal, type] : weak) {
    std::string text = "The keytab has a key of ";
    text.append(principal).append(" of the type ").append(type);
    text += ", which is deprecated: whoever records the traffic may find the key.";
    findings->Warning(OfKeytab(), std::move(text),
                      "Make keys of an AES type for the principal, and upload the new keytab.");
  }
  return {};
}

Status FindOutdatedKeys(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KdcAnswer>> answers = AnswersOfKdc(input.box);
  if (!answers.ok()) return answers.status();
  Status status;
  for (const KdcAnswer& answer : *answers) {
    JudgeKey(answer, findings);
    if (answer.state != KdcAnswer::State::kNone) continue;
    status = Status::Failure(kUnsupported, "The KDC was not asked about " + answer.principal + ": " + answer.detail);
  }
  return status;
}

Status FindRefusedTickets(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KeytabKey>> keys = ListKeytab(input.box, kKeytabFile);
  if (keys.ok() && keys->empty()) return {};
  if (!input.box.root().is_box()) {
    return Status::Failure(kUnsupported, "The journal is not that of this root.");
  }
  JudgeTickets(ReadTicketLog(), findings);
  return {};
}

void JudgeTickets(const TicketLog& log, Findings* findings) {
  for (const auto& [reason, refused] : log.refused()) {
    const std::string tickets = refused.count == 1 ? "a ticket was" : std::to_string(refused.count) + " tickets were";
    std::string text = "In the last hour, ";
    text.append(tickets).append(" refused: ").append(reason);
    text +=
        ". The clients or users with these tickets have no access with Kerberos; the log does not tell who they are.";
    findings->Warning(OfKeytab(), std::move(text),
                      "Compare the keytab and the clock with those of the KDC; let the users sign in anew if the keys "
                      "were replaced.");
  }
}

Status FindClockSkew(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KdcAnswer>> answers = AnswersOfKdc(input.box);
  if (!answers.ok()) return answers.status();
  const auto knows = [](const KdcAnswer& answer) { return answer.clock_lead.has_value(); };
  const auto answer = std::find_if(answers->begin(), answers->end(), knows);
  if (answer == answers->end()) {
    return answers->empty() ? Status() : Status::Failure(kUnsupported, "The KDC has not told its time.");
  }
  const long lead = *answer->clock_lead;
  if (std::abs(lead) <= kMostSkew) return {};
  findings->Error({},
                  "The clock of the box is " + std::to_string(std::abs(lead)) + " seconds " +
                      (lead > 0 ? "behind" : "ahead of") +
                      " that of the KDC: clients with the KDC's time cannot mount with Kerberos.",
                  "Set the clock, and run a time service on the box, for example systemd-timesyncd or chrony.");
  return {};
}

Status FindForeignDomains(const HealthInput& input, Findings* findings) {
  if (FindKerberosRule(input) == nullptr) return {};
  const Result<std::string> own = OwnDomain(input.box);
  if (!own.ok()) return own.status();
  const Result<std::string> folder = input.box.root().Locate(kKernelClients);
  if (!folder.ok()) return folder.status();
  const Result<std::vector<KernelClient>> clients = KernelClients(*folder).List();
  if (!clients.ok()) return clients.status();
  std::set<std::string> domains = {*own};
  for (const KernelClient& client : *clients) {
    const std::string domain = DomainOfClient(client.info.name);
    if (domain.empty() || !domains.insert(domain).second) continue;
    VORN::HealthSubject subject;
    subject.client = client.info.address;
    findings->Notice(std::move(subject),
                     "The client " + client.info.address + " is in the domain " + domain +
                         ", and the NFSv4 domain of the box is " + *own +
                         ": unless its idmapd.conf(5) names that domain, it shows the files of Kerberos users as those "
                         "of nobody.",
                     "Set one NFSv4 domain on the box and on its clients (VORN.Core.FileServ.NFS, set).");
  }
  return {};
}

Status FindUnsynchronisedClock(const HealthInput& input, Findings* findings) {
  const Result<std::vector<KeytabKey>> keys = ListKeytab(input.box, kKeytabFile);
  if (keys.ok() && keys->empty()) return {};
  if (!input.box.root().is_box()) {
    return Status::Failure(kUnsupported, "The clock is not that of this root.");
  }
  timex unused{};
  return JudgeClock(adjtimex(&unused), input.box.Exists(kSynchronised), findings);
}

Status JudgeClock(int state, bool is_marked, Findings* findings) {
  if (state < 0 && is_marked) return {};
  if (state < 0) return Status::System(errno, "The state of the clock cannot be read");
  if (state != TIME_ERROR) return {};
  findings->Warning({},
                    "No time service keeps the clock of the box right. Kerberos refuses clients whose clock differs by "
                    "more than five minutes.",
                    "Run a time service, for example systemd-timesyncd or chrony.");
  return {};
}

}  // namespace vorn

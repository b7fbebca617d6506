// Checks of what Kerberos needs: the keytab and the clock.
#ifndef VORN_LINUX_HEALTH_KERBEROS_FINDINGS_H
#define VORN_LINUX_HEALTH_KERBEROS_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"
#include "ticket_log.h"

namespace vorn {

// Rules that need Kerberos on a box without a usable keytab; at most one finding.
Status FindMissingKeytab(const HealthInput& input, Findings* findings);

// A keytab without a key for "nfs/HOST"; at most one finding.
Status FindMissingHostKey(const HealthInput& input, Findings* findings);

// Keys of encryption types that RFC 6649 and RFC 8429 deprecate.
Status FindWeakKeys(const HealthInput& input, Findings* findings);

// Keys of the NFS service that are not those of the KDC. Asks the KDC (kdc_question.h).
Status FindOutdatedKeys(const HealthInput& input, Findings* findings);

// Tickets of clients that rpc.svcgssd(8) has refused in the last hour; at most one finding for a reason.
Status FindRefusedTickets(const HealthInput& input, Findings* findings);

// Makes the findings of these refusals.
void JudgeTickets(const TicketLog& log, Findings* findings);

// A clock that differs from that of the KDC by more than Kerberos accepts; at most one finding. Asks the KDC.
Status FindClockSkew(const HealthInput& input, Findings* findings);

// Clients whose own domain differs from the box's NFSv4 domain, on a box that uses Kerberos; at most one finding for a
// domain. The domain of a client is known if its name contains it (Linux: the host name).
Status FindForeignDomains(const HealthInput& input, Findings* findings);

// A clock that nothing keeps right, on a box that uses Kerberos; at most one finding.
Status FindUnsynchronisedClock(const HealthInput& input, Findings* findings);

// Judges the clock by the result of adjtimex(2), the state of the clock or -1 with errno, and by whether
// systemd-timesyncd has set the clock.
Status JudgeClock(int state, bool is_marked, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_KERBEROS_FINDINGS_H

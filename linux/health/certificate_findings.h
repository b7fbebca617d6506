// The check of the certificate of the web-API server.
#ifndef VORN_LINUX_HEALTH_CERTIFICATE_FINDINGS_H
#define VORN_LINUX_HEALTH_CERTIFICATE_FINDINGS_H

#include "findings.h"
#include "health_input.h"
#include "status.h"

namespace vorn {

// A certificate for TLS that has expired or expires soon: the one that vornd.conf(5) names, or the self-signed one if
// vornd.conf has an address with TLS. At most one finding.
Status FindExpiringCertificate(const HealthInput& input, Findings* findings);

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_CERTIFICATE_FINDINGS_H

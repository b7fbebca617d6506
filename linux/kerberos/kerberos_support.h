// Whether the kernel server of a box supports Kerberos.
#ifndef VORN_LINUX_KERBEROS_KERBEROS_SUPPORT_H
#define VORN_LINUX_KERBEROS_KERBEROS_SUPPORT_H

#include "box.h"
#include "status.h"

namespace vorn {

// Whether NFS can authenticate by Kerberos (RPCSEC_GSS, RFC 2203): as the platform settings say, or by default
// whether the running kernel has the module rpcsec_gss_krb5.
Result<bool> SupportsKerberos(Box& box);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KERBEROS_SUPPORT_H

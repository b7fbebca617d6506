// Asks the KDC about the keys of a keytab.
#ifndef VORN_LINUX_KERBEROS_ASK_KDC_H
#define VORN_LINUX_KERBEROS_ASK_KDC_H

#include <string_view>
#include <vector>

#include "kdc_answer.h"
#include "status.h"

namespace vorn {

// Gets a ticket for each principal of the NFS service in the keytab with this content, at most eight of them, and tries
// to read it with the keys of the keytab. Signs in with keys of the keytab only: as the principal itself, or as another
// principal of the keytab if the KDC does not let a service sign in. The library finds the KDC by krb5.conf(5).
//
// Waits for the network, for as long as the library does.
Result<std::vector<KdcAnswer>> AskKdc(std::string_view keytab);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_ASK_KDC_H

// The keytab of the NFS service: /etc/nfs/krb5.keytab.
#ifndef VORN_LINUX_KERBEROS_KEYTAB_H
#define VORN_LINUX_KERBEROS_KEYTAB_H

#include <string>
#include <vector>

#include "box.h"
#include "keytab_file.h"
#include "status.h"

namespace vorn {

inline constexpr char kKeytabFile[] = "/etc/nfs/krb5.keytab";

// Validates the keytab at `path` and installs it atomically with mode 0600. The server's
// own principal in the NFS settings becomes that of the keytab. A warning (notice.h) names a key of the former keytab
// that the new one lacks. Fails with kNoKeytab for a file that is not a keytab or has no key; the file at `path` is
// left alone. Without a call context `path` is one of this system, with one it is that of an upload of the call, or
// else a path of the box.
Status ImportKeytab(Box& box, const std::string& path);

// The keys of the keytab at the box's `path`, in file order; none if there is no file.
Result<std::vector<KeytabKey>> ListKeytab(Box& box, const std::string& path);

// The content of the file at the box's `path` without secrets: a keytab becomes what klist(1) prints of it, every other
// content stays as it is.
std::string WithoutKeys(const std::string& path, const std::string& content);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KEYTAB_H

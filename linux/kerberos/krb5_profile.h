// krb5.conf(5), read by the Kerberos library itself.
#ifndef VORN_LINUX_KERBEROS_KRB5_PROFILE_H
#define VORN_LINUX_KERBEROS_KRB5_PROFILE_H

#include <optional>
#include <string>

#include "root.h"
#include "status.h"

namespace vorn {

// The value of `key` in `section` of the krb5.conf at the root's `path`; nullopt if it has none. Includes are
// followed below the root.
Result<std::optional<std::string>> GetKrb5Value(const Root& root, const std::string& path, const std::string& section,
                                                const std::string& key);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KRB5_PROFILE_H

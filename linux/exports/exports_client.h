// Who a client of an export is: the forms that exports(5) knows.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H
#define VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H

#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// Whether `client` is a host name, a pattern of host names, an IPv4 or IPv6 address, a network with
// a prefix length or a mask, a "@netgroup" or "*". Fails with kRefusedText and the reason: for all
// else that exportfs(8) would stop at or pass over, and for what it takes and hardly anybody means
// ("10" is 0.0.0.10, "10.0.0.0/" the whole Internet, "gss/krb5" an old spelling of sec=).
Status CheckExportClient(std::string_view client);

// The same text for two clients that exportfs(8) takes for one: it ignores the case of names and
// the spelling of IPv6 addresses.
std::string ExportClientKey(std::string_view client);

// Likewise, for two networks that hold the same addresses: "10.0.0.0/8", "10.1.0.0/255.0.0.0".
std::string ExportNetworkKey(std::string_view client);

// Whether exportfs(8) asks the resolver for `client`, and may keep it under another name.
bool IsExportHostName(std::string_view client);

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_CLIENT_H

// The frame of a keytab file: a version, then entries, each behind its size.
#ifndef VORN_LINUX_KERBEROS_KEYTAB_FRAME_H
#define VORN_LINUX_KERBEROS_KEYTAB_FRAME_H

#include <cstddef>
#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// How many entries a keytab with this content has. Fails with kNoKeytab unless they end with the content, and
// every field of each within it.
Result<std::size_t> CountKeytabEntries(std::string_view content);

// A failure with kNoKeytab.
Status NoKeytab(const std::string& why);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KEYTAB_FRAME_H

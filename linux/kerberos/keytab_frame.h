// The frame of a keytab file: a version, then entries, each behind its size.
#ifndef VORN_LINUX_KERBEROS_KEYTAB_FRAME_H
#define VORN_LINUX_KERBEROS_KEYTAB_FRAME_H

#include <cstddef>
#include <string>
#include <string_view>

#include "status.h"

namespace vorn {

// Returns the number of entries of a keytab with this content, of version 0x0501 or 0x0502. Zeros after the last entry
// are padding. Fails with kNoKeytab unless the entries fill the content, and the fields of each entry lie within it.
Result<std::size_t> CountKeytabEntries(std::string_view content);

// A failure with kNoKeytab.
Status NoKeytab(const std::string& why);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KEYTAB_FRAME_H

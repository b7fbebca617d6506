// A keytab as MIT Kerberos' own library reads it.
#ifndef VORN_LINUX_KERBEROS_KEYTAB_FILE_H
#define VORN_LINUX_KERBEROS_KEYTAB_FILE_H

#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

struct KeytabKey {
  int version = 0;  // key version number
  std::string principal;
  std::string enc_type;  // RFC 3961 name; "etype 99" for one that the library does not know
};

// Returns the keys of a keytab with this content, in file order. Fails with kNoKeytab unless the library reads the
// content to its last byte, except for zeros at the end. The library accepts a truncated file, reads beyond a damaged
// entry, and leaks memory over it; therefore the frame is validated first (keytab_frame.h).
Result<std::vector<KeytabKey>> ReadKeytab(std::string_view content);

// Returns the lines that "klist -ke" prints of a keytab with this content below its heading: no keys. A content that is
// no keytab gives a line that says so.
std::string PrintKeytab(std::string_view content);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KEYTAB_FILE_H

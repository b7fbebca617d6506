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

// The keys of a keytab with this content, in file order. Fails with kNoKeytab unless the library reads it to
// its last byte. The library takes a file that was cut off for one that ends there, reads beyond a damaged entry, and
// loses memory over it, so it gets to see only a file whose frame is whole.
Result<std::vector<KeytabKey>> ReadKeytab(std::string_view content);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KEYTAB_FILE_H

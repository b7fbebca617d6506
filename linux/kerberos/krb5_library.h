// MIT Kerberos' library: its context, and names of what it knows.
#ifndef VORN_LINUX_KERBEROS_KRB5_LIBRARY_H
#define VORN_LINUX_KERBEROS_KRB5_LIBRARY_H

#include <krb5/krb5.h>

#include <string>
#include <type_traits>

#include "owned.h"

namespace vorn {

using Krb5Context = Owned<std::remove_pointer_t<krb5_context>, krb5_free_context>;

// Returns "" if the library has no memory for the name.
std::string NameOf(krb5_context context, krb5_const_principal principal);

// Returns the RFC 3961 name; "etype 99" for one that the library does not know.
std::string EncTypeName(krb5_enctype type);

std::string ErrorText(krb5_context context, krb5_error_code error);

}  // namespace vorn

#endif  // VORN_LINUX_KERBEROS_KRB5_LIBRARY_H

#include "krb5_library.h"

namespace vorn {

std::string NameOf(krb5_context context, krb5_const_principal principal) {
  char* text = nullptr;
  if (krb5_unparse_name(context, principal, &text) != 0) return "";
  std::string name = text;
  krb5_free_unparsed_name(context, text);
  return name;
}

std::string EncTypeName(krb5_enctype type) {
  char name[64];
  if (krb5_enctype_to_name(type, 0, name, sizeof name) == 0) return name;
  return "etype " + std::to_string(type);
}

std::string ErrorText(krb5_context context, krb5_error_code error) {
  const char* text = krb5_get_error_message(context, error);
  std::string copy = text;
  krb5_free_error_message(context, text);
  return copy;
}

}  // namespace vorn

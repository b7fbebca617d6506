// Conversion of export rules between JSON and the platform's records.
#ifndef VORN_SRC_EXPORT_RULES_H
#define VORN_SRC_EXPORT_RULES_H

#include <json/value.h>

#include "nfsconf.h"

// Returns the rule object of a record. A code without a word leaves its key out (docs/decisions/0023). The
// object has "security_flavor" only `with_kerberos`.
Json::Value RuleToJson(const ExportRule& record, bool with_kerberos);

// Fills the whole record from a rule object whose keys have the right types; `next` becomes nullptr.
// Without Kerberos the security flavours of the object are ignored and only `sys` is set
// (docs/decisions/0033). A client that does not fit is cut (docs/decisions/0034).
void RuleFromJson(const Json::Value& rule, bool with_kerberos, ExportRule* record);

#endif  // VORN_SRC_EXPORT_RULES_H

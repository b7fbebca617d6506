// Export rules between their JSON form and the platform's records.
#ifndef VORN_SRC_EXPORT_RULES_H
#define VORN_SRC_EXPORT_RULES_H

#include <json/value.h>

#include "nfsconf.h"

// The rule object of a record. A code that no word stands for leaves its key out; the security
// flavours are shown only `with_kerberos`.
Json::Value RuleToJson(const ExportRule& record, bool with_kerberos);

// Fills a record, its `next` included (null), from a rule object whose keys have the right types.
// Without Kerberos the security flavours of the object are ignored: the rule accepts "sys" alone.
void RuleFromJson(const Json::Value& rule, bool with_kerberos, ExportRule* record);

#endif  // VORN_SRC_EXPORT_RULES_H

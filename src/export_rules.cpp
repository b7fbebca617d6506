#include "export_rules.h"

#include <cstdio>
#include <optional>
#include <string_view>

#include "json_text.h"

namespace {

struct Word {
  int32_t code;
  const char* text;
};

constexpr Word kPrivileges[] = {{0, "ro"}, {1, "rw"}};
constexpr Word kSquashModes[] = {{VORNNFS_SQUASH_ROOT, "root"},
                                 {VORNNFS_SQUASH_ADMIN, "admin"},
                                 {VORNNFS_SQUASH_GUEST, "guest"},
                                 {VORNNFS_SQUASH_ALL_ADMIN, "all_admin"}};

struct Flavour {
  const char* key;
  int32_t ExportRule::*flag;
};

constexpr Flavour kFlavours[] = {{"sys", &ExportRule::sys},
                                 {"kerberos", &ExportRule::krb5},
                                 {"kerberos_integrity", &ExportRule::krb5i},
                                 {"kerberos_privacy", &ExportRule::krb5p}};

// Sets `key` to the word of `code`. A code without a word leaves the key out.
template <size_t kCount>
void AddWord(const Word (&words)[kCount], int32_t code, Json::Value& member_holder, const char* key) {
  for (const Word& word : words) {
    if (word.code == code) member_holder[key] = word.text;
  }
}

// Returns the code of the word `value`, or `fallback` if no word equals it (docs/decisions/0023).
template <size_t kCount>
int32_t CodeOf(const Word (&words)[kCount], const Json::Value& value, int32_t fallback) {
  const std::optional<std::string_view> text = TextOf(value);
  for (const Word& word : words) {
    if (text == word.text) return word.code;
  }
  return fallback;
}

int32_t Flag(bool value) { return value ? 1 : 0; }

void SetFlavours(const Json::Value& flavours, bool with_kerberos, ExportRule* record) {
  if (!with_kerberos) {
    record->sys = 1;
    record->krb5 = record->krb5i = record->krb5p = 0;
    return;
  }
  for (const Flavour& flavour : kFlavours) record->*flavour.flag = Flag(flavours[flavour.key].asBool());
}

}  // namespace

Json::Value RuleToJson(const ExportRule& record, bool with_kerberos) {
  Json::Value rule;
  rule["client"] = record.client;
  AddWord(kPrivileges, record.privilege, rule, "privilege");
  AddWord(kSquashModes, record.squash, rule, "root_squash");
  if (record.write_mode == VORNNFS_WRITE_ASYNC || record.write_mode == VORNNFS_WRITE_SYNC) {
    rule["async"] = record.write_mode == VORNNFS_WRITE_ASYNC;
  }
  rule["insecure"] = record.insecure == 1;
  rule["crossmnt"] = record.crossmnt == 1;
  if (!with_kerberos) return rule;
  for (const Flavour& flavour : kFlavours) rule["security_flavor"][flavour.key] = record.*flavour.flag == 1;
  return rule;
}

void RuleFromJson(const Json::Value& rule, bool with_kerberos, ExportRule* record) {
  record->next = nullptr;
  // A longer client is cut: docs/decisions/0034.
  snprintf(record->client, sizeof record->client, "%s", rule["client"].asCString());
  record->privilege = CodeOf(kPrivileges, rule["privilege"], 0);
  record->squash = CodeOf(kSquashModes, rule["root_squash"], VORNNFS_SQUASH_GUEST);
  record->write_mode = rule["async"].asBool() ? VORNNFS_WRITE_ASYNC : VORNNFS_WRITE_SYNC;
  record->insecure = Flag(rule["insecure"].asBool());
  record->crossmnt = Flag(rule["crossmnt"].asBool());
  SetFlavours(rule["security_flavor"], with_kerberos, record);
}

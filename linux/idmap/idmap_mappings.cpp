#include "idmap_mappings.h"

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "unicode.h"

namespace vorn {
namespace {

// A mapping that the file can represent.
struct CheckedMapping {
  IniKey principal;
  IniValue local_name;
};
using CheckedMappings = std::map<std::string, CheckedMapping>;  // by the principal as libnfsidmap compares it

// In bytes; a principal of a keytab may be as long (KeytabEntry in platform/nfsconf.h).
constexpr std::size_t kLongestPrincipal = 513;

bool IsStored(const IniDocument& document, const IDMapping& mapping) {
  return document.Get("Static", mapping.principal) == mapping.local_name;
}

// Rejects confusable characters: a mapping must be unambiguous to a human reader. A local name is that of an
// account and is not restricted further.
bool MayBeStored(const std::string& principal) {
  return principal.size() <= kLongestPrincipal && IsPlainText(principal);
}

// Converts the mappings to what the file can represent. A mapping that the file has already is not validated
// again. Two principals that differ only in case are one to libnfsidmap, so they cannot both be stored.
Result<CheckedMappings> Check(const IDMappings& mappings, const IniDocument& document) {
  CheckedMappings checked;
  for (const IDMapping& mapping : mappings) {
    const std::optional<IniKey> key = IniKey::From(mapping.principal);
    const std::optional<IniValue> value = IniValue::From(mapping.local_name);
    if (!key || !value || !(IsStored(document, mapping) || MayBeStored(mapping.principal)))
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot represent a principal or its local name");
    if (!checked.emplace(FoldIniName(mapping.principal), CheckedMapping{*key, *value}).second) {
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot distinguish two principals that differ only in case");
    }
  }
  return checked;
}

bool IsStored(const IniDocument& document, const CheckedMappings& mappings) {
  const std::vector<IniEntry> stored = document.Entries("Static");
  if (stored.size() != mappings.size()) return false;
  for (const IniEntry& entry : stored) {
    const auto wanted = mappings.find(FoldIniName(entry.key));
    if (wanted == mappings.end() || wanted->second.principal.text() != entry.key) return false;
    if (wanted->second.local_name.text() != entry.value) return false;
  }
  return true;
}

// New mappings are added in the given order.
void WriteMappings(const IDMappings& mappings, const CheckedMappings& checked, IniDocument* document) {
  const IniSection section = *IniSection::From("Static");
  document->EndLastLine();  // a mapping without line feed has no effect now, but would get one with the next line
  for (const IniEntry& entry : document->Entries("Static")) {
    const auto wanted = checked.find(FoldIniName(entry.key));
    const bool stays = wanted != checked.end() && wanted->second.principal.text() == entry.key;
    if (!stays) document->Remove("Static", entry.key);
  }
  for (const IDMapping& mapping : mappings) {
    const CheckedMapping& stored = checked.at(FoldIniName(mapping.principal));
    document->Set(section, stored.principal, stored.local_name);
  }
}

std::vector<std::string> Words(const std::string& list) {
  std::vector<std::string> words;
  for (std::size_t at = 0; (at = list.find_first_not_of(" \t,", at)) != std::string::npos;) {
    const std::size_t end = std::min(list.find_first_of(" \t,", at), list.size());
    words.push_back(list.substr(at, end - at));
    at = end;
  }
  return words;
}

// Static mappings have an effect only if "static" is among the methods, and the first method that knows a
// principal decides. Without GSS-Methods the methods of Method apply: idmapd.conf(5).
Status EnableStaticMappings(IniDocument* document) {
  const IniKey key = *IniKey::From("GSS-Methods");
  const std::string names = document->Get("Translation", "Method").value_or("nsswitch");
  const std::string methods = document->Get("Translation", key.text()).value_or(names);
  const std::vector<std::string> words = Words(methods);
  if (!words.empty() && words.front() == "static") return {};
  std::string value = "static";
  for (const std::string& word : words) value += word == "static" ? "" : "," + word;
  const std::optional<IniValue> text = IniValue::From(value);
  if (!text) return Status::Failure(kSyntax, "the translation methods cannot be written back");
  document->Set(*IniSection::From("Translation"), key, *text);
  return {};
}

}  // namespace

Status StoreMappings(const IDMappings& mappings, IniDocument* document) {
  const Result<CheckedMappings> checked = Check(mappings, *document);
  if (!checked.ok()) return checked.status();
  if (!IsStored(*document, *checked)) WriteMappings(mappings, *checked, document);
  return checked->empty() ? Status() : EnableStaticMappings(document);
}

}  // namespace vorn

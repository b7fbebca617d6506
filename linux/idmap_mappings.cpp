#include "idmap_mappings.h"

#include <algorithm>
#include <map>
#include <string>
#include <vector>

#include "nfsconf.h"
#include "unicode.h"

namespace vorn {
namespace {

struct Mapping {
  IniKey principal;
  IniValue local_name;
};
using Mappings = std::map<std::string, Mapping>;  // by the principal as the reader compares it

// As long as a principal of a keytab may be.
constexpr std::size_t kLongestPrincipal = sizeof(KeytabEntry::principal) - 1;

bool IsStored(const IniDocument& document, const KLIBSZHASH::Pair& mapping) {
  return document.Get("Static", mapping.first) == mapping.second;
}

// Who looks at the file later must see whom it maps. A local name is that of an account, as it is.
bool MayBeStored(const std::string& principal) {
  return principal.size() <= kLongestPrincipal && IsPlainText(principal);
}

// The wanted mappings. What the file has already is not judged again. The reader takes two principals that differ in
// case for one: a table with both cannot be stored.
Result<Mappings> Check(const KLIBSZHASH& table, const IniDocument& document) {
  Mappings mappings;
  for (const KLIBSZHASH::Pair& pair : table.pairs) {
    const auto& [principal, local_name] = pair;
    const std::optional<IniKey> key = IniKey::From(principal);
    const std::optional<IniValue> value = IniValue::From(local_name);
    if (!key || !value || !(IsStored(document, pair) || MayBeStored(principal)))
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot carry a principal or its local name");
    if (!mappings.emplace(FoldIniName(principal), Mapping{*key, *value}).second) {
      return Status::Failure(kRefusedText, "idmapd.conf(5) cannot tell two principals that differ in case only");
    }
  }
  return mappings;
}

bool IsStored(const IniDocument& document, const Mappings& mappings) {
  const std::vector<IniEntry> stored = document.Entries("Static");
  if (stored.size() != mappings.size()) return false;
  for (const IniEntry& entry : stored) {
    const auto wanted = mappings.find(FoldIniName(entry.key));
    if (wanted == mappings.end() || wanted->second.principal.text() != entry.key) return false;
    if (wanted->second.local_name.text() != entry.value) return false;
  }
  return true;
}

// In the table's order, so that new mappings come in the order in which they were made.
void WriteMappings(const KLIBSZHASH& table, const Mappings& mappings, IniDocument* document) {
  const IniSection section = *IniSection::From("Static");
  document->EndLastLine();  // or it would come to life later, whether it is wanted or not
  for (const IniEntry& entry : document->Entries("Static")) {
    const auto wanted = mappings.find(FoldIniName(entry.key));
    const bool stays = wanted != mappings.end() && wanted->second.principal.text() == entry.key;
    if (!stays) document->Remove("Static", entry.key);
  }
  for (const KLIBSZHASH::Pair& pair : table.pairs) {
    const Mapping& mapping = mappings.at(FoldIniName(pair.first));
    document->Set(section, mapping.principal, mapping.local_name);
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

// Static mappings count only where the method "static" does, and the first method that knows a
// principal decides. Without methods for GSS those for names hold: idmapd.conf(5).
Status HonourStaticMappings(IniDocument* document) {
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

Status StoreMappings(const KLIBSZHASH& table, IniDocument* document) {
  const Result<Mappings> mappings = Check(table, *document);
  if (!mappings.ok()) return mappings.status();
  if (!IsStored(*document, *mappings)) WriteMappings(table, *mappings, document);
  return mappings->empty() ? Status() : HonourStaticMappings(document);
}

}  // namespace vorn

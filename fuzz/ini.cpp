// The INI document: an edit has its effect, and every byte that it does not concern is preserved.
#include <cstdint>

#include "ini_document.h"
#include "require.h"

namespace {

using vorn::IniDocument;

std::string EntriesOf(const IniDocument& document, std::string_view section) {
  std::string text;
  for (const vorn::IniEntry& entry : document.Entries(section)) text += entry.key + "\n" + entry.value + "\n";
  return text;
}

// Parsing the text of an edited document gives a document with the same values.
void RequireSameAfterReading(const IniDocument& document) {
  const IniDocument again = IniDocument::Parse(document.Text());
  for (const char* section : {"General", "Static"}) {
    Require(EntriesOf(document, section) == EntriesOf(again, section));
  }
}

// A key whose last value is in a section with an argument has no value, and no edit gives it one.
void RequireUnchangeable(IniDocument* document, const vorn::IniKey& key, const vorn::IniValue& value) {
  const std::string before = document->Text();
  document->Set(*vorn::IniSection::From("Static"), key, value);
  Require(!document->Get("Static", key.text()));
  Require(!document->Remove("Static", key.text()));
  Require(document->Text() == before);
}

// The first line is the key, the second the value, the rest the file.
std::string_view TakeLine(std::string_view* text) {
  const std::string_view line = text->substr(0, text->find('\n'));
  text->remove_prefix(std::min(line.size() + 1, text->size()));
  return line;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  std::string_view text(reinterpret_cast<const char*>(data), size);
  const auto key = vorn::IniKey::From(TakeLine(&text));
  const auto value = vorn::IniValue::From(TakeLine(&text));
  IniDocument document = IniDocument::Parse(std::string(text));
  Require(document.Text() == text);
  if (!key || !value) return 0;
  const auto last = document.FindLast("Static", key->text());
  if (last && last->is_hidden) {
    RequireUnchangeable(&document, *key, *value);
    return 0;
  }

  const std::string others = EntriesOf(document, "General");
  const std::string tail(text.substr(document.Text().find_last_of('\n') + 1));
  document.Set(*vorn::IniSection::From("Static"), *key, *value);
  Require(document.Get("Static", key->text()) == value->text());
  Require(EntriesOf(document, "General") == others);
  RequireSameAfterReading(document);
  Require(document.Remove("Static", key->text()));
  Require(!document.Get("Static", key->text()));
  Require(EntriesOf(document, "General") == others);
  RequireSameAfterReading(document);
  const std::string edited = document.Text();
  Require(edited.size() >= tail.size() && edited.substr(edited.size() - tail.size()) == tail);
  return 0;
}

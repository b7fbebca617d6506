#include "unicode.h"

#include <unicase.h>
#include <unictype.h>
#include <uninorm.h>
#include <unistr.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <memory>

namespace vorn {
namespace {

using Utf8 = std::unique_ptr<std::uint8_t, void (*)(void*)>;

const std::uint8_t* Bytes(std::string_view text) { return reinterpret_cast<const std::uint8_t*>(text.data()); }

bool IsHidden(ucs4_t character) {
  constexpr ucs4_t kObjectReplacement = 0xFFFC;
  constexpr ucs4_t kReplacement = 0xFFFD;  // of what could not be converted
  if (character == kObjectReplacement || character == kReplacement) return true;
  constexpr std::uint32_t kHidden = UC_CATEGORY_MASK_C | UC_CATEGORY_MASK_Zl | UC_CATEGORY_MASK_Zp;
  return uc_is_general_category_withtable(character, kHidden) || uc_is_property_default_ignorable_code_point(character);
}

// Null for what belongs to no alphabet, or to many.
const uc_script_t* AlphabetOf(ucs4_t letter) {
  constexpr std::string_view kNone[] = {"Common", "Inherited", "Han", "Hiragana", "Katakana", "Hangul", "Bopomofo"};
  const uc_script_t* script = uc_script(letter);
  const bool none = script == nullptr || std::find(std::begin(kNone), std::end(kNone), script->name) != std::end(kNone);
  return none ? nullptr : script;
}

bool MixesAlphabets(const std::u32string& text) {
  const uc_script_t* alphabet = nullptr;  // of the word so far
  for (const ucs4_t character : text) {
    if (!uc_is_property_alphabetic(character)) alphabet = nullptr;
    const uc_script_t* own = AlphabetOf(character);
    if (own == nullptr) continue;
    if (alphabet != nullptr && alphabet != own) return true;
    alphabet = own;
  }
  return false;
}

// Of valid UTF-8.
std::u32string Characters(std::string_view text) {
  std::u32string characters;
  for (std::size_t at = 0; at < text.size();) {
    ucs4_t character = 0;
    at += static_cast<std::size_t>(u8_mbtouc(&character, Bytes(text) + at, text.size() - at));
    characters.push_back(character);
  }
  return characters;
}

// NFKC: letters with their accents, and nothing that stands for another character.
bool IsNormal(std::string_view text) {
  std::size_t size = 0;
  const Utf8 normal(u8_normalize(UNINORM_NFKC, Bytes(text), text.size(), nullptr, &size), &std::free);
  return normal != nullptr && text == std::string_view(reinterpret_cast<const char*>(normal.get()), size);
}

std::string UpperCaseOrSame(std::string_view text) {
  Result<std::string> upper = UpperCase(text);
  return upper.ok() ? std::move(*upper) : std::string(text);
}

}  // namespace

Result<std::string> UpperCase(std::string_view text) {
  if (u8_check(Bytes(text), text.size()) != nullptr) return Status::Failure(EILSEQ, "the text is no UTF-8");
  if (text.empty()) return std::string();
  std::size_t size = 0;
  const Utf8 upper(u8_toupper(Bytes(text), text.size(), "", nullptr, nullptr, &size), &std::free);
  if (upper == nullptr) return Status::System(errno, "upper case");
  return std::string(reinterpret_cast<const char*>(upper.get()), size);
}

CaselessSubstring::CaselessSubstring(std::string_view substring) : substring_(UpperCaseOrSame(substring)) {}

bool CaselessSubstring::IsIn(std::string_view text) const {
  return UpperCaseOrSame(text).find(substring_) != std::string::npos;
}

bool IsPlainText(std::string_view text) {
  // Most texts are of these alone.
  if (std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c <= '~'; })) return true;
  if (u8_check(Bytes(text), text.size()) != nullptr) return false;
  const std::u32string characters = Characters(text);
  return std::none_of(characters.begin(), characters.end(), IsHidden) && !MixesAlphabets(characters) && IsNormal(text);
}

}  // namespace vorn

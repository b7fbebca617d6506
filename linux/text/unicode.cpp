#include "unicode.h"

#include <unicase.h>
#include <unictype.h>
#include <uninorm.h>
#include <unistr.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "ascii.h"

namespace vorn {
namespace {

using Utf8 = std::unique_ptr<std::uint8_t, void (*)(void*)>;

const std::uint8_t* Bytes(std::string_view text) { return reinterpret_cast<const std::uint8_t*>(text.data()); }

bool IsHidden(ucs4_t character) {
  constexpr ucs4_t kObjectReplacement = 0xFFFC;
  constexpr ucs4_t kReplacement = 0xFFFD;  // stands for a malformed part of a text
  if (character == kObjectReplacement || character == kReplacement) return true;
  constexpr std::uint32_t kHidden = UC_CATEGORY_MASK_C | UC_CATEGORY_MASK_Zl | UC_CATEGORY_MASK_Zp;
  return uc_is_general_category_withtable(character, kHidden) || uc_is_property_default_ignorable_code_point(character);
}

// Returns nullptr for a character that belongs to no alphabet or to several.
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

// Decodes valid UTF-8.
std::u32string Characters(std::string_view text) {
  std::u32string characters;
  for (std::size_t at = 0; at < text.size();) {
    ucs4_t character = 0;
    at += static_cast<std::size_t>(u8_mbtouc(&character, Bytes(text) + at, text.size() - at));
    characters.push_back(character);
  }
  return characters;
}

// Whether the text is in NFKC: accents are composed with their letters, and there are no compatibility forms.
bool IsNormal(std::string_view text) {
  std::size_t size = 0;
  const Utf8 normal(u8_normalize(UNINORM_NFKC, Bytes(text), text.size(), nullptr, &size), &std::free);
  return normal != nullptr && text == std::string_view(reinterpret_cast<const char*>(normal.get()), size);
}

// Looks at eight bytes at a time.
bool IsAscii(std::string_view text) {
  std::uint64_t all = 0;
  for (; text.size() >= sizeof all; text.remove_prefix(sizeof all)) {
    std::uint64_t word = 0;
    std::memcpy(&word, text.data(), sizeof word);
    all |= word;
  }
  for (const char c : text) all |= static_cast<unsigned char>(c);
  return (all & 0x8080808080808080U) == 0;
}

}  // namespace

bool IsValidUtf8(std::string_view text) { return IsAscii(text) || u8_check(Bytes(text), text.size()) == nullptr; }

Result<std::string> UpperCase(std::string_view text) {
  if (IsAscii(text)) return UpperAscii(text);
  if (!IsValidUtf8(text)) return Status::Failure(EILSEQ, "the text is not UTF-8");
  std::size_t size = 0;
  const Utf8 upper(u8_toupper(Bytes(text), text.size(), "", nullptr, nullptr, &size), &std::free);
  if (upper == nullptr) return Status::System(errno, "upper case");
  return std::string(reinterpret_cast<const char*>(upper.get()), size);
}

std::string UpperCaseOrSame(std::string_view text) {
  Result<std::string> upper = UpperCase(text);
  return upper.ok() ? std::move(*upper) : std::string(text);
}

CaselessSubstring::CaselessSubstring(std::string_view substring) : substring_(UpperCaseOrSame(substring)) {}

bool CaselessSubstring::IsIn(std::string_view text) const {
  return UpperCaseOrSame(text).find(substring_) != std::string::npos;
}

std::string ToValidUtf8(std::string_view text) {
  if (IsAscii(text)) return std::string(text);
  std::string valid;
  while (const std::uint8_t* bad = u8_check(Bytes(text), text.size())) {
    const auto good = static_cast<std::size_t>(bad - Bytes(text));
    valid.append(text.substr(0, good)).append("\xef\xbf\xbd");
    text.remove_prefix(good);
    ucs4_t character = 0;
    text.remove_prefix(static_cast<std::size_t>(std::max(u8_mbtouc(&character, Bytes(text), text.size()), 1)));
  }
  return valid.append(text);
}

bool IsPlainText(std::string_view text) {
  // Most texts consist of printable ASCII only.
  if (std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c <= '~'; })) return true;
  if (!IsValidUtf8(text)) return false;
  const std::u32string characters = Characters(text);
  return std::none_of(characters.begin(), characters.end(), IsHidden) && !MixesAlphabets(characters) && IsNormal(text);
}

}  // namespace vorn

#include "unseen_characters.h"

#include <unistr.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace {

struct Range {
  ucs4_t first;
  ucs4_t last;
};

constexpr Range kUnseen[] = {
    {0x00, 0x08},       // control characters, without tab and line feed
    {0x0B, 0x1F},       //
    {0x7F, 0x9F},       // delete, and control characters of ISO 8859
    {0xAD, 0xAD},       // soft hyphen
    {0x200B, 0x200F},   // without width, marks of direction
    {0x2028, 0x202E},   // line and paragraph separator, embeddings and overrides of direction
    {0x2060, 0x206F},   // word joiner, isolates of direction, deprecated format characters
    {0xFEFF, 0xFEFF},   // byte order mark
    {0xFF01, 0xFF5E},   // full-width forms of ASCII
    {0xFFF9, 0xFFFF},   // interlinear annotation, replacement character, noncharacters
    {0xE0000, 0xE007F}  // tags
};

bool IsUnseen(ucs4_t character) {
  return std::any_of(std::begin(kUnseen), std::end(kUnseen),
                     [&](const Range& range) { return range.first <= character && character <= range.last; });
}

}  // namespace

bool HasUnseenCharacters(std::string_view text) {
  const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
  if (u8_check(bytes, text.size()) != nullptr) return true;
  for (std::size_t at = 0; at < text.size();) {
    ucs4_t character = 0;
    at += static_cast<std::size_t>(u8_mbtouc(&character, bytes + at, text.size() - at));
    if (IsUnseen(character)) return true;
  }
  return false;
}

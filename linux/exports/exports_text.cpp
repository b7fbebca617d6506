#include "exports_text.h"

#include <algorithm>

namespace vorn {
namespace {

constexpr int kEnd = -1;

bool IsOctal(char c) { return c >= '0' && c <= '7'; }

// Decodes an escape that the last four bytes of `word` complete. As in exportfs(8), its backslash may
// be the result of another escape, and a number above \377 is no escape.
void DecodeTail(std::string* word) {
  const std::size_t size = word->size();
  if (size < 4) return;
  const char* tail = word->data() + size - 4;
  if (tail[0] != '\\' || tail[1] > '3' || !std::all_of(tail + 1, tail + 4, IsOctal)) return;
  const int byte = ((tail[1] & 7) << 6) | ((tail[2] & 7) << 3) | (tail[3] & 7);
  word->resize(size - 4);
  word->push_back(static_cast<char>(byte));
}

}  // namespace

int ExportsReader::Next() {
  if (at_end()) return kEnd;
  const char c = text_[position_++];
  if (c != '\\' || at_end() || text_[position_] != '\n') return static_cast<unsigned char>(c);
  ++position_;
  while (!at_end() && (text_[position_] == ' ' || text_[position_] == '\t')) ++position_;
  return ' ';
}

void ExportsReader::SkipComment() { position_ = std::min(text_.find('\n', position_), text_.size()); }

std::size_t ExportsReader::SkipToPath() {
  std::size_t line = position_;
  for (;;) {
    const std::size_t here = position_;
    const int c = Next();
    if (c == kEnd) return here;
    if (c == '\n') line = position_;
    if (c == '#') SkipComment();
    if (c == '\n' || c == '#' || IsBlank(c)) continue;
    position_ = here;
    return line;
  }
}

std::size_t ExportsReader::SkipToClient() {
  for (;;) {
    const std::size_t here = position_;
    const int c = Next();
    if (IsBlank(c)) continue;
    position_ = here;
    if (c != '#') return std::string_view::npos;
    SkipComment();
    return here;
  }
}

ExportsReader::Found ExportsReader::ReadWord(std::size_t longest, std::string* word) {
  word->clear();
  bool quoted = false;
  in_quotation_ = false;
  while (word->size() <= longest) {
    word_end_ = position_;
    const int c = Next();
    if (c == kEnd) {
      in_quotation_ = quoted;
      break;
    }
    if (!quoted && EndsWord(c)) {
      if (c == '\n') position_ = word_end_;
      break;
    }
    if (c == '"') {
      quoted = !quoted;
      continue;
    }
    word->push_back(static_cast<char>(c));
    DecodeTail(word);
  }
  if (word->empty()) return Found::kNothing;
  if (word->size() > longest) return Found::kTooLong;
  word->resize(std::min(word->find('\0'), word->size()));
  return Found::kWord;
}

std::string EncodeExportsWord(std::string_view text) {
  std::string word;
  bool after_backslash = false;  // digits after it would make an escape of it
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    const bool plain = byte > ' ' && byte != 0x7f && c != '"' && c != '\\' && c != '#';
    const bool digit = after_backslash && IsOctal(c);
    if (plain && !digit) {
      word.push_back(c);
    } else {
      const auto octal = [byte](int shift) { return static_cast<char>('0' + ((byte >> shift) & 7)); };
      word.append({'\\', octal(6), octal(3), octal(0)});
    }
    after_backslash = c == '\\' || digit;
  }
  return word;
}

std::string NormalExportPath(std::string_view path) {
  std::string normal;
  for (std::size_t at = 0; at < path.size();) {
    const std::size_t end = std::min(path.find('/', at), path.size());
    const std::string_view name = path.substr(at, end - at);
    if (at == 0 && end > 0) {
      normal = name;
    } else if (!name.empty() && name != ".") {
      normal.append("/").append(name);
    }
    at = end + 1;
  }
  return normal.empty() && !path.empty() ? "/" : normal;
}

}  // namespace vorn

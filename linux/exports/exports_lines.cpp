#include "exports_lines.h"

#include <algorithm>
#include <cstring>
#include <utility>

#include "exports_text.h"

namespace vorn {
namespace {

constexpr std::size_t kNone = std::string_view::npos;

bool IsPlain(std::string_view text) { return text.find('"') == kNone && text.find('\\') == kNone; }

// Finds one line after the other. Nearly all lines have no quotation mark, no backslash and no default options; those
// end at the next line break and need not be read for that.
class LineFinder {
 public:
  explicit LineFinder(std::string_view text) : text_(text) {}

  // Returns the next line that begins at or after `position`, which must not decrease from call to call. After the
  // last line it returns an empty span at the end of the text.
  ExportSpan Next(std::size_t position) {
    ExportsReader reader(text_, position);
    ExportSpan span{position, position, position, std::exchange(left_over_, kNone)};
    if (position == text_.size() || text_[position] != '/') span.begin = reader.SkipToPath();
    span.path = reader.position();
    const std::size_t newline = text_.find('\n', span.path);
    span.end = newline == kNone ? text_.size() : newline + 1;
    if (IsSimple(span)) return span;
    const ExportLine line = ReadExportLine(text_, span);
    left_over_ = line.left_over;
    has_left_over_ = has_left_over_ || left_over_ != kNone;
    return line.span;
  }

  // Whether one of the lines has a word that exportfs(8) may apply to the next line.
  bool has_left_over() const { return has_left_over_; }

 private:
  bool IsSimple(const ExportSpan& span) {
    return span.inherited == kNone && Following('"', span.path, &quotation_) >= span.end &&
           Following('\\', span.path, &backslash_) >= span.end && !HasDefaults(span);
  }

  bool HasDefaults(const ExportSpan& span) {
    for (std::size_t at = Following('-', span.path, &hyphen_); at < span.end; at = Following('-', at + 1, &hyphen_)) {
      if (at > 0 && ExportsReader::EndsWord(text_[at - 1])) return true;
    }
    return false;
  }

  // Returns where `c` is next at or after `position`. `last` keeps the result of the last search, so that the whole
  // text is searched only once.
  std::size_t Following(char c, std::size_t position, std::size_t* last) const {
    if (*last < position || position == 0) *last = std::min(text_.find(c, position), text_.size());
    return *last;
  }

  std::string_view text_;
  std::size_t quotation_ = 0;
  std::size_t backslash_ = 0;
  std::size_t hyphen_ = 0;
  std::size_t left_over_ = kNone;
  bool has_left_over_ = false;
};

// Large blocks are compared by memcmp(3), which is several times faster than a loop over bytes.
constexpr std::size_t kBlock = 4096;

std::size_t CommonPrefix(std::string_view a, std::string_view b) {
  const std::size_t size = std::min(a.size(), b.size());
  std::size_t same = 0;
  while (size - same >= kBlock && std::memcmp(a.data() + same, b.data() + same, kBlock) == 0) same += kBlock;
  while (same < size && a[same] == b[same]) ++same;
  return same;
}

std::size_t CommonSuffix(std::string_view a, std::string_view b) {
  const std::size_t size = std::min(a.size(), b.size());
  const char* const a_end = a.data() + a.size();
  const char* const b_end = b.data() + b.size();
  std::size_t same = 0;
  while (size - same >= kBlock && std::memcmp(a_end - same - kBlock, b_end - same - kBlock, kBlock) == 0)
    same += kBlock;
  while (same < size && *(a_end - same - 1) == *(b_end - same - 1)) ++same;
  return same;
}

bool BeginsLine(std::string_view text, std::size_t position) { return position == 0 || text[position - 1] == '\n'; }

CommonText CommonLines(std::string_view a, std::string_view b) {
  const std::size_t prefix = CommonPrefix(a, b);
  const std::size_t head = a.substr(0, prefix).rfind('\n') + 1;  // npos + 1 is 0
  std::size_t tail = CommonSuffix(a.substr(head), b.substr(head));
  if (!BeginsLine(a, a.size() - tail) || !BeginsLine(b, b.size() - tail)) {
    const std::size_t newline = a.find('\n', a.size() - tail);
    tail = newline == kNone ? 0 : a.size() - newline - 1;
  }
  return {head, tail};
}

}  // namespace

ExportsLines::ExportsLines(std::string text) : text_(std::move(text)) { FindAll(); }

ExportsLines::ExportsLines(std::string text, const ExportsLines& previous) : text_(std::move(text)) {
  if (!previous.is_plain_ || !FindChanged(previous, CommonLines(previous.text_, text_))) FindAll();
}

ExportsLines::ExportsLines(std::string text, const ExportsLines& previous, const CommonText& common)
    : text_(std::move(text)) {
  if (!previous.is_plain_ || !FindChanged(previous, common)) FindAll();
}

void ExportsLines::FindAll() {
  spans_.clear();
  spans_.reserve(text_.size() / 64 + 1);
  LineFinder finder(text_);
  for (ExportSpan line = finder.Next(0); line.path < text_.size(); line = finder.Next(line.end)) spans_.push_back(line);
  is_plain_ = IsPlain(text_) && !finder.has_left_over();
}

// Finds the lines between those that `previous` has as well. Returns false if one of them may continue in another
// line, and if `previous` has such lines.
bool ExportsLines::FindChanged(const ExportsLines& previous, const CommonText& common) {
  const std::size_t tail_begin = text_.size() - common.tail;
  const auto up_to_tail = std::string_view{text_}.substr(0, tail_begin);
  if (!IsPlain(up_to_tail.substr(common.head))) return false;

  const auto begins_before = [](const ExportSpan& line, std::size_t position) { return line.begin < position; };
  const ExportSpans& old = previous.spans_;
  const auto head_end = std::lower_bound(old.begin(), old.end(), common.head, begins_before);
  const auto tail = std::lower_bound(old.begin(), old.end(), previous.text_.size() - common.tail, begins_before);
  spans_.reserve(old.size() + 16);
  spans_.assign(old.begin(), head_end);
  LineFinder finder(up_to_tail);
  for (ExportSpan line = finder.Next(common.head); line.path < tail_begin; line = finder.Next(line.end)) {
    spans_.push_back(line);
  }
  is_plain_ = !finder.has_left_over();
  if (!is_plain_) return false;
  const std::size_t shift = text_.size() - previous.text_.size();  // modulo 2^64 if the text is shorter
  spans_.insert(spans_.end(), tail, old.end());
  for (auto line = spans_.end() - (old.end() - tail); shift != 0 && line != spans_.end(); ++line) {
    line->begin += shift;
    line->path += shift;
    line->end += shift;
  }
  shared_head_ = static_cast<std::size_t>(head_end - old.begin());
  shared_tail_ = static_cast<std::size_t>(old.end() - tail);
  return true;
}

}  // namespace vorn

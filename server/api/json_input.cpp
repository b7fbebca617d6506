#include "json_input.h"

#include <json/reader.h>
#include <unistr.h>

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <memory>
#include <utility>

#include "reusable.h"

namespace vorn::server {
namespace {

bool IsDigit(char c) { return c >= '0' && c <= '9'; }

const std::uint8_t* Bytes(std::string_view text) { return reinterpret_cast<const std::uint8_t*>(text.data()); }

// Returns the position of the first byte that is not UTF-8; the size of `text` if there is none.
std::size_t Utf8End(std::string_view text) {
  const std::uint8_t* fault = u8_check(Bytes(text), text.size());
  return fault == nullptr ? text.size() : static_cast<std::size_t>(fault - Bytes(text));
}

// Finds characters, numbers and strings that RFC 8259 does not allow and JsonCpp accepts even in its strict mode,
// and limits the memory and depth that JsonCpp would need. JsonCpp checks the order of the tokens.
class LexicalCheck {
 public:
  explicit LexicalCheck(std::string_view text) : text_(text) {}

  // Returns what is wrong at position(), or nullptr.
  const char* Run() {
    if (const std::size_t end = Utf8End(text_); end != text_.size()) return Fault(end, "not UTF-8");
    while (at_ < text_.size()) {
      if (const char* fault = Token(); fault != nullptr) return fault;
    }
    return nullptr;
  }
  std::size_t position() const { return at_; }
  bool too_large() const { return values_ > kMaxJsonValues; }
  std::size_t cost() const {
    return values_ * kJsonValueCost + containers_ * kJsonContainerCost + texts_ * kJsonTextCost + text_.size();
  }

 private:
  const char* Fault(std::size_t at, const char* what) {
    at_ = at;
    return what;
  }
  char Peek(std::size_t ahead = 0) const { return at_ + ahead < text_.size() ? text_[at_ + ahead] : '\0'; }

  const char* Token() {
    const char c = Peek();
    if (c == ' ' || c == '\t' || c == '\r' || c == '\n') return Blank();
    if (c == ':') return Colon();
    after_string_ = c == '"';
    if (c == ',' || c == '}' || c == ']') return Separator(c);
    if (++values_ > kMaxJsonValues) return "more than 100000 values";
    if (c == '"') return String();
    if (c == '-' || IsDigit(c)) return Number();
    if (c >= 'a' && c <= 'z') return Word();
    return Opening(c);
  }

  const char* Blank() {
    ++at_;
    return nullptr;
  }

  // The string before a colon is a key and not a value.
  const char* Colon() {
    if (!after_string_) return "unexpected character";
    after_string_ = false;
    --values_;
    ++at_;
    return nullptr;
  }

  const char* Separator(char c) {
    if (c != ',') --depth_;
    ++at_;
    return nullptr;
  }

  const char* Opening(char c) {
    if (c != '{' && c != '[') return "unexpected character";
    if (++depth_ > kMaxJsonDepth) return "nested too deep";
    ++containers_;
    ++at_;
    return nullptr;
  }

  const char* Word() {
    for (const std::string_view word : {"true", "false", "null"}) {
      if (text_.substr(at_, word.size()) != word) continue;
      at_ += word.size();
      return nullptr;
    }
    return "neither true, false nor null";
  }

  const char* Number() {
    const std::size_t begin = at_;
    Skip("-");
    if (Peek() == '0' && IsDigit(Peek(1))) return Fault(begin, "a number begins with 0");
    if (!Digits()) return Fault(begin, "not a number");
    if (Skip(".") && !Digits()) return Fault(begin, "not a number");
    if (Skip("eE")) {
      Skip("+-");
      if (!Digits()) return Fault(begin, "not a number");
    }
    return IsFinite(text_.substr(begin, at_ - begin)) ? nullptr : Fault(begin, "a number beyond the range of a double");
  }

  // Some versions of JsonCpp read a number that is too large as infinity.
  static bool IsFinite(std::string_view number) {
    const bool may_be_large = number.size() > 300 || number.find_first_of("eE") != std::string_view::npos;
    return !may_be_large || std::isfinite(std::strtod(std::string(number).c_str(), nullptr));
  }

  bool Skip(std::string_view one_of) {
    if (at_ == text_.size() || one_of.find(Peek()) == std::string_view::npos) return false;
    ++at_;
    return true;
  }

  bool Digits() {
    const std::size_t begin = at_;
    while (IsDigit(Peek())) ++at_;
    return at_ > begin;
  }

  const char* String() {
    ++texts_;
    for (++at_; at_ < text_.size() && Peek() != '"';) {
      if (static_cast<unsigned char>(Peek()) < 0x20) return "control character in a text";
      if (Peek() != '\\') {
        ++at_;
      } else if (const char* fault = Escape(); fault != nullptr) {
        return fault;
      }
    }
    ++at_;
    return nullptr;
  }

  const char* Escape() {
    if (Peek(1) != 'u') {
      if (std::string_view("\"\\/bfnrt").find(Peek(1)) == std::string_view::npos) return "unknown escape in a text";
      at_ += 2;
      return nullptr;
    }
    const int unit = CodeUnit(at_);
    if (unit < 0) return "\\u takes four hexadecimal digits";
    if (unit == 0) return "U+0000 in a text";
    const bool pair = unit >= 0xD800 && unit < 0xDC00;
    const int second = pair ? CodeUnit(at_ + 6) : -1;
    if ((unit >= 0xDC00 && unit < 0xE000) || (pair && (second < 0xDC00 || second >= 0xE000))) {
      return "half a surrogate pair in a text";
    }
    at_ += pair ? 12 : 6;
    return nullptr;
  }

  // Returns the value of "\uXXXX" at `at`; negative if there is no such escape.
  int CodeUnit(std::size_t at) const {
    if (text_.substr(std::min(at, text_.size()), 2) != "\\u") return -1;
    int value = 0;
    for (const char c : text_.substr(at + 2, 4)) {
      const std::size_t digit = std::string_view("0123456789abcdefABCDEF").find(c);
      if (digit == std::string_view::npos) return -1;
      value = value * 16 + static_cast<int>(digit < 16 ? digit : digit - 6);
    }
    return at + 6 <= text_.size() ? value : -1;
  }

  std::string_view text_;
  std::size_t at_ = 0;
  int depth_ = 0;
  std::size_t values_ = 0;
  std::size_t containers_ = 0;  // arrays and objects
  std::size_t texts_ = 0;       // keys and strings
  bool after_string_ = false;   // the last token was a string
};

std::string Located(std::string_view text, std::size_t position, const char* what) {
  const std::string_view before = text.substr(0, position);
  const std::size_t last_break = before.rfind('\n');
  const auto line = 1 + std::count(before.begin(), before.end(), '\n');
  const std::size_t column = last_break == std::string_view::npos ? position + 1 : position - last_break;
  return "Line " + std::to_string(line) + ", Column " + std::to_string(column) + ": " + what;
}

std::unique_ptr<Json::CharReader> NewReader() {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["skipBom"] = false;
  return std::unique_ptr<Json::CharReader>(builder.newCharReader());
}

// Returns the first of JsonCpp's messages ("* Line 1, Column 2\n  Missing ...\n* ...") on one line.
std::string FirstMessage(const std::string& messages) {
  const std::size_t place = messages.find("\n  ");
  if (messages.compare(0, 2, "* ") != 0 || place == std::string::npos) return messages;
  const std::size_t end = messages.find('\n', place + 1);
  return messages.substr(2, place - 2) + ": " + messages.substr(place + 3, end - place - 3);
}

}  // namespace

bool IsPlainUtf8(std::string_view text) {
  return Utf8End(text) == text.size() && text.find('\0') == std::string_view::npos;
}

std::optional<JsonText> JsonText::Check(std::string_view text, JsonFault* fault) {
  LexicalCheck check(text);
  const char* what = check.Run();
  if (what == nullptr) return JsonText(text, check.cost());
  *fault = {Located(text, check.position(), what), check.too_large()};
  return std::nullopt;
}

std::optional<Json::Value> JsonText::ParseObject(std::string* error) const {
  // Constructing a reader costs as much as reading a small request.
  static Reusable<Json::CharReader> readers(NewReader);
  Json::Value value;
  std::string messages;
  const bool parsed = readers.With([&](Json::CharReader& reader) {
    return reader.parse(text_.data(), text_.data() + text_.size(), &value, &messages);
  });
  if (!parsed) {
    *error = FirstMessage(messages);
    return std::nullopt;
  }
  if (value.isObject()) return value;
  *error = "Line 1, Column 1: one JSON object is expected";
  return std::nullopt;
}

std::optional<Json::Value> ParseJsonObject(std::string_view text, std::string* error) {
  JsonFault fault;
  const std::optional<JsonText> checked = JsonText::Check(text, &fault);
  if (checked) return checked->ParseObject(error);
  *error = std::move(fault.text);
  return std::nullopt;
}

}  // namespace vorn::server

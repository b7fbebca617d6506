// Strings that were validated when they were constructed.
#ifndef VORN_LINUX_TEXT_CHECKED_TEXT_H
#define VORN_LINUX_TEXT_CHECKED_TEXT_H

#include <optional>
#include <string>
#include <string_view>
#include <utility>

namespace vorn {

// A string that `Rules::Accepts` accepts. A function that takes a CheckedText cannot be given an unchecked string.
template <typename Rules>
class CheckedText {
 public:
  // nullopt for a string that is not accepted.
  static std::optional<CheckedText> From(std::string_view text) {
    if (!Rules::Accepts(text)) return std::nullopt;
    return CheckedText(std::string(text));
  }

  const std::string& text() const { return text_; }

 private:
  explicit CheckedText(std::string text) : text_(std::move(text)) {}

  std::string text_;
};

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_CHECKED_TEXT_H

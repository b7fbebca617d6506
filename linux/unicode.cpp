#include "unicode.h"

#include <unicase.h>
#include <unistr.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>

#include "core.h"
#include "error.h"

namespace vorn {
namespace {

std::string UpperCaseOrSame(std::string_view text) {
  Result<std::string> upper = UpperCase(text);
  return upper.ok() ? std::move(*upper) : std::string(text);
}

Result<int> UpperCaseInto(const char* text, char* buffer, int size) {
  if (text == nullptr || buffer == nullptr) return Status::Failure(EINVAL, "no text, or no buffer");
  const Result<std::string> upper = UpperCase(text);
  if (!upper.ok()) return upper.status();
  if (size <= 0 || upper->size() >= static_cast<std::size_t>(size)) {
    return Status::Failure(ERANGE, "the upper-case text does not fit into " + std::to_string(size) + " bytes");
  }
  std::memcpy(buffer, upper->c_str(), upper->size() + 1);
  return static_cast<int>(upper->size());
}

}  // namespace

Result<std::string> UpperCase(std::string_view text) {
  const auto* bytes = reinterpret_cast<const std::uint8_t*>(text.data());
  if (u8_check(bytes, text.size()) != nullptr) return Status::Failure(EILSEQ, "the text is no UTF-8");
  if (text.empty()) return std::string();
  std::size_t size = 0;
  const std::unique_ptr<std::uint8_t, void (*)(void*)> upper(
      u8_toupper(bytes, text.size(), "", nullptr, nullptr, &size), &std::free);
  if (upper == nullptr) return Status::System(errno, "upper case");
  return std::string(reinterpret_cast<const char*>(upper.get()), size);
}

CaselessSubstring::CaselessSubstring(std::string_view substring) : substring_(UpperCaseOrSame(substring)) {}

bool CaselessSubstring::IsIn(std::string_view text) const {
  return UpperCaseOrSame(text).find(substring_) != std::string::npos;
}

}  // namespace vorn

int KLIBCUnicodeUTF8StrUpper(const char* text, char* buffer, int size) {
  const vorn::Result<int> length = vorn::UpperCaseInto(text, buffer, size);
  return length.ok() ? *length : vorn::ToResult(length.status());
}

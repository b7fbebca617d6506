// Case folding of names that are compared without regard to case in ASCII only, whatever the locale: the names of
// INI files (nfs.conf(5)), host names (RFC 4343), principals as libnfsidmap compares them, realms made of host names.
#ifndef VORN_LINUX_TEXT_ASCII_H
#define VORN_LINUX_TEXT_ASCII_H

#include <algorithm>
#include <string>
#include <string_view>

namespace vorn {

inline char LowerAscii(char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; }

inline std::string LowerAscii(std::string_view text) {
  std::string lower(text);
  std::transform(lower.begin(), lower.end(), lower.begin(), [](char c) { return LowerAscii(c); });
  return lower;
}

inline char UpperAscii(char c) { return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c; }

inline std::string UpperAscii(std::string_view text) {
  std::string upper(text);
  std::transform(upper.begin(), upper.end(), upper.begin(), [](char c) { return UpperAscii(c); });
  return upper;
}

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_ASCII_H

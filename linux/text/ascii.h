// Case folding of names that are compared without regard to case in ASCII only, whatever the locale: the names of
// INI files (nfs.conf(5)), host names (RFC 4343), principals as libnfsidmap compares them.
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

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_ASCII_H

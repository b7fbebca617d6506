#include "log_quote.h"

#include <algorithm>

namespace vorn::server {
namespace {

constexpr std::string_view kCut = "...";

bool IsControl(char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7F; }
bool ContinuesCharacter(char c) { return (static_cast<unsigned char>(c) & 0xC0U) == 0x80U; }  // in UTF-8

}  // namespace

std::string QuotedForLog(std::string_view text) {
  std::string quoted(text.substr(0, kMostQuotedBytes));
  if (text.size() > kMostQuotedBytes) {
    std::size_t end = kMostQuotedBytes - kCut.size();
    while (end > 0 && ContinuesCharacter(text[end])) --end;
    quoted.resize(end);
    quoted += kCut;
  }
  std::replace_if(quoted.begin(), quoted.end(), IsControl, '?');
  return quoted;
}

}  // namespace vorn::server

#include "browser_guard.h"

#include <algorithm>
#include <string>

#include "header_value.h"

namespace vorn::server {
namespace {

bool IsPort(std::string_view text) {
  return text.size() <= 5 && std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

}  // namespace

bool IsLoopbackHost(std::string_view host) {
  const std::string lower = LowerAscii(host);
  for (const std::string_view name : {"localhost", "127.0.0.1", "[::1]"}) {
    if (lower.compare(0, name.size(), name) != 0) continue;
    std::string_view rest = lower;
    rest.remove_prefix(name.size());
    return rest.empty() || (rest.front() == ':' && IsPort(rest.substr(1)));
  }
  return false;
}

bool IsLoopbackOrigin(std::string_view origin) {
  for (const std::string_view scheme : {"http://", "https://"}) {
    if (origin.substr(0, scheme.size()) == scheme) return IsLoopbackHost(origin.substr(scheme.size()));
  }
  return false;
}

}  // namespace vorn::server

#include "caller.h"

#include <algorithm>

namespace vorn::server {
namespace {

constexpr std::string_view kReader = "reader";
constexpr std::string_view kAdministrator = "administrator";

}  // namespace

std::string_view NameOf(Role role) { return role == Role::kAdministrator ? kAdministrator : kReader; }

std::optional<Role> ParseRole(std::string_view name) {
  if (name == kAdministrator) return Role::kAdministrator;
  if (name == kReader) return Role::kReader;
  return std::nullopt;
}

bool Permits(const std::vector<std::string>& list, std::string_view name) {
  return list.empty() || std::find(list.begin(), list.end(), name) != list.end();
}

}  // namespace vorn::server

// The authenticated sender of a request, and what it may do.
#ifndef VORN_SERVER_CALLER_H
#define VORN_SERVER_CALLER_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vorn::server {

enum class Role { kReader, kAdministrator };

// "reader" or "administrator".
std::string_view NameOf(Role role);
std::optional<Role> ParseRole(std::string_view name);

// Immutable, so any thread may read it.
struct Caller {
  std::string name;  // for logs: "uid 0", "account alice", "token backup"
  Role role = Role::kReader;
  std::vector<std::string> apis{};    // the only APIs that it may use; empty: all
  std::vector<std::string> shares{};  // the only shares that it may name; empty: all, and methods without a share
  std::string session{};              // the id of its session; empty if it has none
};
using CallerPtr = std::shared_ptr<const Caller>;

// Whether the list restricts nothing or has this name.
bool Permits(const std::vector<std::string>& list, std::string_view name);

}  // namespace vorn::server

#endif  // VORN_SERVER_CALLER_H

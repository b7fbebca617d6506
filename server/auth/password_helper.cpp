#include "password_helper.h"

namespace vorn::server {
namespace {

constexpr std::string_view kRefused = "refused";
constexpr std::string_view kNoRole = "no role";
constexpr std::string_view kUnavailable = "unavailable";

}  // namespace

std::string FormatRequest(const PasswordRequest& request) {
  std::string message;
  message.reserve(kMaxMessage);  // so that the password is not copied to another block
  return message.append(request.account)
      .append(1, '\0')
      .append(request.password)
      .append(1, '\0')
      .append(request.address);
}

std::optional<PasswordRequest> ParseRequest(std::string_view message) {
  const std::size_t first = message.find('\0');
  const std::size_t second = first == std::string_view::npos ? first : message.find('\0', first + 1);
  if (second == std::string_view::npos) return std::nullopt;
  return PasswordRequest{std::string(message.substr(0, first)),
                         std::string(message.substr(first + 1, second - first - 1)),
                         std::string(message.substr(second + 1))};
}

std::string FormatVerdict(const PasswordVerdict& verdict) {
  switch (verdict.kind) {
    case PasswordVerdict::Kind::kGranted:
      return std::string(NameOf(verdict.role)) + '\n' + verdict.account;
    case PasswordVerdict::Kind::kRefused:
      return std::string(kRefused);
    case PasswordVerdict::Kind::kNoRole:
      return std::string(kNoRole);
    case PasswordVerdict::Kind::kUnavailable:
      break;
  }
  return std::string(kUnavailable);
}

PasswordVerdict ParseVerdict(std::string_view message) {
  if (message == kRefused) return {PasswordVerdict::Kind::kRefused};
  if (message == kNoRole) return {PasswordVerdict::Kind::kNoRole};
  const std::size_t end = message.find('\n');
  if (end == std::string_view::npos || end + 1 == message.size()) return {};
  const std::optional<Role> role = ParseRole(message.substr(0, end));
  if (!role) return {};
  return {PasswordVerdict::Kind::kGranted, *role, std::string(message.substr(end + 1))};
}

}  // namespace vorn::server

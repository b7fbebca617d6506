#include "user.h"

#include <cerrno>
#include <functional>
#include <string>

#include "current_box.h"
#include "error.h"
#include "lists.h"
#include "unicode.h"
#include "users.h"

namespace vorn {
namespace {

using IsWanted = std::function<bool(const std::string& name)>;

Status AppendUsers(KLIBSZLIST** list, int type, const IsWanted& is_wanted) {
  if (list == nullptr || *list == nullptr) return Status::Failure(EINVAL, "no list");
  if (type != VORNUSER_LOCAL) return Status::Failure(EINVAL, "no such type of account");
  const Result<Accounts> users = ReadLocalUsers(CurrentBox());
  if (!users.ok()) return users.status();
  for (const Account& user : *users) {
    const bool can_be_named = IsValidUtf8(user.name);  // callers name accounts in JSON
    if (!can_be_named || !is_wanted(user.name)) continue;
    if (Status status = Append(list, user.name.c_str()); !status.ok()) return status;
  }
  return {};
}

Status AppendUsersWith(KLIBSZLIST** list, int type, const char* substring, int flags) {
  if (substring == nullptr) return Status::Failure(EINVAL, "no substring");
  if (flags == 0) {
    return AppendUsers(list, type, [&](const std::string& name) { return name.find(substring) != std::string::npos; });
  }
  const CaselessSubstring wanted(substring);
  return AppendUsers(list, type, [&](const std::string& name) { return wanted.IsIn(name); });
}

}  // namespace
}  // namespace vorn

int VORNUserEnum(KLIBSZLIST** list, int type) {
  return vorn::ToResult(vorn::AppendUsers(list, type, [](const std::string&) { return true; }));
}

int VORNUserEnumBySubstr(KLIBSZLIST** list, int type, const char* substring, int flags) {
  return vorn::ToResult(vorn::AppendUsersWith(list, type, substring, flags));
}

#include "user.h"

#include <pwd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <functional>
#include <memory>
#include <sstream>
#include <vector>

#include "error.h"
#include "files.h"
#include "root.h"
#include "unicode.h"

namespace vorn {
namespace {

Result<std::string> ReadText(std::string_view path) {
  const Result<std::string> place = Root::Current().Locate(path);
  if (!place.ok()) return place.status();
  Result<FileText> file = ReadFileOrNothing(*place);
  if (!file.ok()) return file.status();
  return std::move(file->text);
}

// Whose accounts are those of people: login.defs(5).
struct UserIds {
  unsigned long smallest = 1000;
  unsigned long largest = 60000;
};

Result<UserIds> ReadUserIds() {
  const Result<std::string> text = ReadText("/etc/login.defs");
  if (!text.ok()) return text.status();
  UserIds ids;
  std::istringstream lines(*text);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string name;
    unsigned long number = 0;
    if (!(words >> name >> number)) continue;
    if (name == "UID_MIN") ids.smallest = number;
    if (name == "UID_MAX") ids.largest = number;
  }
  return ids;
}

// A line that is no account is passed over, as the C library does.
Status ForEachAccount(const std::function<Status(const passwd&)>& visit) {
  Result<std::string> text = ReadText("/etc/passwd");
  if (!text.ok()) return text.status();
  if (text->empty()) return {};
  const std::unique_ptr<FILE, int (*)(FILE*)> stream(fmemopen(text->data(), text->size(), "r"), &std::fclose);
  if (stream == nullptr) return Status::System(errno, "/etc/passwd");
  std::vector<char> line(text->size() + 1);  // never too short
  passwd account{};
  passwd* found = nullptr;
  while (fgetpwent_r(stream.get(), &account, line.data(), line.size(), &found) == 0) {
    if (Status status = visit(account); !status.ok()) return status;
  }
  return {};
}

Status Enumerate(KLIBSZLIST** list, int type, const std::function<bool(const char*)>& is_wanted) {
  if (list == nullptr || *list == nullptr) return Status::Failure(EINVAL, "no list");
  if (type != VORNUSER_LOCAL) return Status::Failure(EINVAL, "no such type of account");
  const Result<UserIds> ids = ReadUserIds();
  if (!ids.ok()) return ids.status();
  return ForEachAccount([&](const passwd& account) {
    const bool is_persons = account.pw_uid >= ids->smallest && account.pw_uid <= ids->largest;
    if (!is_persons || !is_wanted(account.pw_name)) return Status();
    const bool pushed = KLIBCSzListPush(list, account.pw_name) >= 0;
    return pushed ? Status() : Status::Failure(KLIBCErrGet(), "the list of users cannot be filled");
  });
}

Status EnumerateBySubstring(KLIBSZLIST** list, int type, const char* substring, int flags) {
  if (substring == nullptr) return Status::Failure(EINVAL, "no substring");
  if (flags == 0) {
    return Enumerate(list, type, [&](const char* name) { return std::strstr(name, substring) != nullptr; });
  }
  const CaselessSubstring wanted(substring);
  return Enumerate(list, type, [&](const char* name) { return wanted.IsIn(name); });
}

}  // namespace
}  // namespace vorn

int VORNUserEnum(KLIBSZLIST** list, int type) {
  return vorn::ToResult(vorn::Enumerate(list, type, [](const char*) { return true; }));
}

int VORNUserEnumBySubstr(KLIBSZLIST** list, int type, const char* substring, int flags) {
  return vorn::ToResult(vorn::EnumerateBySubstring(list, type, substring, flags));
}

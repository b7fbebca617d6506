#include "core.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "box_program.h"
#include "call_rights.h"
#include "configuration_lock.h"
#include "current_box.h"
#include "error.h"
#include "ini_file.h"
#include "krb5_profile.h"
#include "service_control.h"
#include "unicode.h"

namespace vorn {
namespace {

// The locks of the VornConf objects of this thread. VornConf has no members, because its layout is the contract's.
// Its objects are automatic, so the last one constructed is the first one destroyed.
std::vector<std::unique_ptr<ConfigurationLock>>& Configurations() {
  thread_local std::vector<std::unique_ptr<ConfigurationLock>> configurations;
  return configurations;
}

bool EndsWith(std::string_view text, std::string_view end) {
  return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

Result<std::optional<std::string>> FindValue(Box& box, const std::string& path, const char* section, const char* key) {
  if (EndsWith(path, "krb5.conf")) return GetKrb5Value(box.root(), path, section, key);
  const Result<SharedIniFile> file = IniFile::Open(box, path);
  if (!file.ok()) return file.status();
  if (!(*file)->exists()) return Status::System(ENOENT, (*file)->location());
  return (*file)->document().Get(section, key);
}

// Copies a text into a caller's buffer. Returns its length.
Result<int> CopyText(const std::string& text, const std::string& name, char* buffer, int size) {
  if (size <= 0 || text.size() >= static_cast<std::size_t>(size)) {
    return Status::Failure(ERANGE, name + " does not fit into " + std::to_string(size) + " bytes");
  }
  std::memcpy(buffer, text.c_str(), text.size() + 1);
  return static_cast<int>(text.size());
}

Result<int> GetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size) {
  if (path == nullptr || section == nullptr || key == nullptr || buffer == nullptr) {
    return Status::Failure(EINVAL, "a path, a section, a key or a buffer is missing");
  }
  const Result<std::optional<std::string>> value = FindValue(CurrentBox(), path, section, key);
  if (!value.ok()) return value.status();
  const std::string name = std::string(path) + ": " + key + " in [" + section + "]";
  if (!*value) return Status::System(ENOENT, name);
  if (!IsValidUtf8(**value)) return Status::Failure(EILSEQ, name + " is not UTF-8");
  return CopyText(**value, name, buffer, size);
}

Result<int> UpperCaseInto(const char* text, char* buffer, int size) {
  if (text == nullptr || buffer == nullptr) return Status::Failure(EINVAL, "no text, or no buffer");
  const Result<std::string> upper = UpperCase(text);
  return upper.ok() ? CopyText(*upper, "the upper-case text", buffer, size) : upper.status();
}

int ToLength(const Result<int>& length) { return length.ok() ? *length : ToResult(length.status()); }

std::string Text(const char* text) { return text == nullptr ? "" : text; }

// An upload of the call is a file of this system; every other path is one of the box.
bool Exists(const std::string& path) {
  return IsUpload(path) ? access(path.c_str(), F_OK) == 0 : CurrentBox().Exists(path);
}

}  // namespace
}  // namespace vorn

using vorn::CurrentBox;
using vorn::Text;
using vorn::ToResult;

VornConf::VornConf() {
  auto& configurations = vorn::Configurations();
  configurations.push_back(std::make_unique<vorn::ConfigurationLock>(CurrentBox()));
  ToResult(configurations.back()->status());
}

VornConf::~VornConf() { vorn::Configurations().pop_back(); }

int KLIBServiceIsEnabled(const char* service) {
  const vorn::Result<bool> enabled = vorn::IsServiceEnabled(CurrentBox(), Text(service));
  if (!enabled.ok()) return ToResult(enabled.status());
  return *enabled ? 1 : 0;
}

int KLIBServiceStart(const char* service, int /*flags*/) {
  return ToResult(vorn::StartService(CurrentBox(), Text(service)));
}

int KLIBServiceStop(const char* service, int /*flags*/) {
  return ToResult(vorn::StopService(CurrentBox(), Text(service)));
}

int KLIBServiceRestart(const char* service) { return ToResult(vorn::RestartService(CurrentBox(), Text(service))); }

int KLIBServiceReload(const char* service) { return ToResult(vorn::ReloadService(CurrentBox(), Text(service))); }

int KLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size) {
  return vorn::ToLength(vorn::GetSectionValue(path, section, key, buffer, size));
}

int KLIBCUnicodeUTF8StrUpper(const char* text, char* buffer, int size) {
  return vorn::ToLength(vorn::UpperCaseInto(text, buffer, size));
}

int KLIBCFileExist(const char* path) { return vorn::Exists(Text(path)) ? 1 : 0; }

int KLIBCExec(const char* program, const char* a1, const char* a2, const char* a3, const char* a4) {
  std::vector<std::string> arguments;
  for (const char* argument : {a1, a2, a3, a4}) {
    if (argument == nullptr) break;
    arguments.emplace_back(argument);
  }
  return ToResult(vorn::RunBoxProgram(CurrentBox(), Text(program), arguments));
}

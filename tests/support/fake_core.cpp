// The core library of the fake platform: configuration context, errors, services, files, programs.
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cstdio>
#include <string>

#include "fake_platform.h"

namespace {

int ServiceCall(const char* operation, const std::string& arguments, int enabled_after) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails(operation, arguments)) return platform.FailureResult(operation);
  if (enabled_after >= 0) platform.enabled = enabled_after;
  return 0;
}

}  // namespace

VornConf::VornConf() {
  FakePlatform::Current().Record("VornConf");
  FakePlatform::Current().Born("VornConf");
}

VornConf::~VornConf() {
  FakePlatform::Current().Record("~VornConf");
  FakePlatform::Current().Died("VornConf");
}

namespace WebUtils {

int IsPortConflict(const char* service, int first, int last) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string port = std::string(service) + " " + std::to_string(first);
  platform.Record("IsPortConflict", port + " " + std::to_string(last));
  const auto& conflicts = platform.port_conflicts;
  const bool is_taken = std::find(conflicts.begin(), conflicts.end(), port) != conflicts.end();
  return is_taken ? platform.FailureResult("IsPortConflict") : 0;
}

}  // namespace WebUtils

extern "C" {

int KLIBCErrGet(void) { return FakePlatform::Current().last_error(); }
const char* KLIBCErrorGetFile(void) { return "mounts.cpp"; }
int KLIBCErrorGetLine(void) { return 42; }

int KLIBServiceIsEnabled(const char* service) {
  FakePlatform::Current().Record("KLIBServiceIsEnabled", service);
  return FakePlatform::Current().enabled;
}

int KLIBServiceStart(const char* service, int flags) {
  return ServiceCall("KLIBServiceStart", service + (" " + std::to_string(flags)), 1);
}

int KLIBServiceStop(const char* service, int flags) {
  return ServiceCall("KLIBServiceStop", service + (" " + std::to_string(flags)), 0);
}

int KLIBServiceRestart(const char* service) { return ServiceCall("KLIBServiceRestart", service, -1); }

int KLIBServiceReload(const char* service) { return ServiceCall("KLIBServiceReload", service, -1); }

int KLIBCFileGetSectionValue(const char* path, const char* section, const char* key, char* buffer, int size) {
  FakePlatform& platform = FakePlatform::Current();
  const std::string place = std::string(path) + " " + section + " " + key;
  if (platform.Fails("KLIBCFileGetSectionValue", place)) return -1;
  if (!platform.has_realm || platform.realm.size() >= static_cast<size_t>(size)) return platform.Refuse();
  return snprintf(buffer, static_cast<size_t>(size), "%s", platform.realm.c_str());
}

int KLIBCUnicodeUTF8StrUpper(const char* text, char* buffer, int size) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("KLIBCUnicodeUTF8StrUpper", text)) return -1;
  std::string upper = text;
  std::transform(upper.begin(), upper.end(), upper.begin(),
                 [](unsigned char c) { return static_cast<char>(std::toupper(c)); });
  if (upper.size() >= static_cast<size_t>(size)) return platform.Refuse();
  return snprintf(buffer, static_cast<size_t>(size), "%s", upper.c_str());
}

int KLIBCFileExist(const char* path) {
  FakePlatform& platform = FakePlatform::Current();
  platform.Record("KLIBCFileExist", path);
  const bool known = std::find(platform.files.begin(), platform.files.end(), path) != platform.files.end();
  return known || access(path, F_OK) == 0 ? 1 : 0;
}

int KLIBCExec(const char* program, const char* a1, const char* a2, const char* a3, const char* a4) {
  std::string arguments = program;
  for (const char* argument : {a1, a2, a3, a4}) {
    arguments += argument == nullptr ? " -" : std::string(" ") + argument;
  }
  FakePlatform& platform = FakePlatform::Current();
  return platform.Fails("KLIBCExec", arguments) ? platform.FailureResult("KLIBCExec") : 0;
}
}

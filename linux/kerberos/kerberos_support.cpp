#include "kerberos_support.h"

#include <sys/utsname.h>

#include <algorithm>
#include <string>

#include "files.h"
#include "platform_settings.h"
#include "root.h"

namespace vorn {
namespace {

// Exists while the server side of RPCSEC_GSS is loaded.
constexpr const char* kContextCache = "/proc/net/rpc/auth.rpcsec.context";

// These files list the kernel's modules, one per line: the loadable ones and the built-in ones.
constexpr const char* kModuleLists[] = {"modules.dep", "modules.builtin"};

bool Exists(const Root& root, const std::string& path) {
  const auto located = root.Locate(path);
  struct stat info {};
  return located.ok() && stat(located->c_str(), &info) == 0;
}

bool Names(const Root& root, const std::string& list, const std::string& module) {
  const auto located = root.Locate(list);
  if (!located.ok()) return false;
  const auto file = ReadFileOrNothing(*located);
  return file.ok() && file->text.find("/" + module + ".ko") != std::string::npos;
}

bool KernelOffersKerberos(const Root& root) {
  if (Exists(root, kContextCache)) return true;
  utsname kernel{};
  if (uname(&kernel) != 0) return false;
  const std::string folder = std::string("/lib/modules/") + kernel.release + "/";
  return std::any_of(std::begin(kModuleLists), std::end(kModuleLists),
                     [&](const char* list) { return Names(root, folder + list, "rpcsec_gss_krb5"); });
}

}  // namespace

Result<bool> SupportsKerberos(Box& box) {
  const auto settings = PlatformSettings::Load(box);
  if (!settings.ok()) return settings.status();
  if ((*settings)->kerberos != PlatformSettings::Kerberos::kAuto) {
    return (*settings)->kerberos == PlatformSettings::Kerberos::kYes;
  }
  return KernelOffersKerberos(box.root());
}

}  // namespace vorn

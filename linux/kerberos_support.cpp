// Whether the kernel server can authenticate by Kerberos: as the setting says, or what the running
// kernel offers.
#include <sys/utsname.h>

#include <algorithm>
#include <string>

#include "error.h"
#include "files.h"
#include "nfsconf.h"
#include "root.h"
#include "settings.h"

namespace vorn {
namespace {

// There while the server side of RPCSEC_GSS is loaded.
constexpr const char* kContextCache = "/proc/net/rpc/auth.rpcsec.context";

// Files that name the modules, one per line: those that can be loaded, those that are built in.
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

Result<bool> SupportsKerberos() {
  const auto settings = Settings::Load();
  if (!settings.ok()) return settings.status();
  if (settings->kerberos != Settings::Kerberos::kAuto) return settings->kerberos == Settings::Kerberos::kYes;
  return KernelOffersKerberos(Root::Current());
}

}  // namespace
}  // namespace vorn

extern "C" int VORNNFSSupportKerberos(void) {
  const auto supported = vorn::SupportsKerberos();
  if (supported.ok()) return *supported ? 1 : 0;
  vorn::ToResult(supported.status());
  return 0;  // every other value would be a yes
}

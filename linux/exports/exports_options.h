// The options of one client in an exports(5) file, and what they mean.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H
#define VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H

#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// What a security flavour may do: the only options that "sec=" makes differ.
struct ExportAccess {
  bool read_only = true;
  bool root_squash = true;
  bool all_squash = false;
};

struct ExportFlavor {
  std::string name;  // "sys", "krb5", "krb5i", "krb5p", "none"
  ExportAccess access;
};

// As built, what exports(5) says of a client without options.
struct ExportOptions {
  std::vector<ExportFlavor> flavors = {{"sys", {}}};  // never empty, no name twice, in the server's order
  bool async = false;
  bool insecure = false;
  bool crossmnt = false;
  int anon_uid = 65534;
  int anon_gid = 65534;
  std::vector<std::string> others;  // every other word, in order: "fsid=0", "no_wdelay"

  // Whether every flavour may do the same.
  bool HasOneAccess() const;

  // An option list of the same meaning, without parentheses.
  std::string Text() const;
};

bool operator==(const ExportAccess& a, const ExportAccess& b);
bool operator==(const ExportFlavor& a, const ExportFlavor& b);
bool operator==(const ExportOptions& a, const ExportOptions& b);

// Reads option lists one after the other: the defaults that stand before a client, then its own.
class ExportOptionReader {
 public:
  // "rw,sec=krb5:krb5i". Fails with kSyntax, naming the word, where exportfs(8) gives up.
  Status Apply(std::string_view list);

  // What the lists read so far mean.
  ExportOptions Options() const;

 private:
  Status ApplyWord(const std::string& word);
  Status ApplyFlavors(const std::string& names);
  bool ApplySwitch(std::string_view word);

  ExportOptions options_ = {{}, false, false, false, 65534, 65534, {}};
  ExportAccess access_;               // for flavours that are named later, or when none is
  std::vector<std::size_t> current_;  // indices of the flavours that the last "sec=" named
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H

// The options of one client in an exports(5) file, and what they mean.
#ifndef VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H
#define VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H

#include <string>
#include <string_view>
#include <vector>

#include "status.h"

namespace vorn {

// The rights of a client with one security flavour: the options that the kernel keeps per flavour
// (NFSEXP_SECINFO_FLAGS of <linux/nfsd/export.h>).
struct ExportAccess {
  bool read_only = true;
  bool root_squash = true;
  bool all_squash = false;
  bool insecure = false;
};

struct ExportFlavor {
  std::string name;  // "sys", "krb5", "krb5i", "krb5p", "none"
  ExportAccess access;
};

// The default values are those that exports(5) gives a client without options.
struct ExportOptions {
  std::vector<ExportFlavor> flavors = {{"sys", {}}};  // never empty, no name twice, in the server's order
  bool async = false;
  bool crossmnt = false;
  int anon_uid = 65534;
  int anon_gid = 65534;
  std::vector<std::string> others;  // every other word, in order: "fsid=0", "no_wdelay", "xprtsec=tls"

  // Whether every flavour has the same access.
  bool HasOneAccess() const;

  // Returns an option list of the same meaning, without parentheses.
  std::string Text() const;
};

bool operator==(const ExportAccess& a, const ExportAccess& b);
bool operator==(const ExportFlavor& a, const ExportFlavor& b);
bool operator==(const ExportOptions& a, const ExportOptions& b);

// Reads option lists one after the other: the defaults before a client ("-rw"), then its own list.
class ExportOptionReader {
 public:
  // Reads a list such as "rw,sec=krb5:krb5i". Fails with kSyntax and the word at which exportfs(8) stops
  // reading the file. An unknown word of the form "name=value" is kept: newer versions know more of them.
  Status Apply(std::string_view list);

  // Returns the meaning of the lists read so far.
  ExportOptions Options() const;

 private:
  Status ApplyWord(const std::string& word);
  Status ApplyFlavors(const std::string& names);
  bool ApplySwitch(std::string_view word);

  ExportOptions options_ = {{}, false, false, 65534, 65534, {}};
  ExportAccess access_;               // of flavours that are named later, or of "sys" if none is named
  std::vector<std::size_t> current_;  // indices of the flavours that the last "sec=" named
};

}  // namespace vorn

#endif  // VORN_LINUX_EXPORTS_EXPORTS_OPTIONS_H

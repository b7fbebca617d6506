#include "left_shares.h"

#include <syslog.h>  // LOG_WARNING

#include <cerrno>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "box_paths.h"
#include "exports_files.h"
#include "exports_text.h"
#include "lines.h"
#include "notice.h"
#include "path_resolver.h"
#include "platform_settings.h"
#include "share_rules.h"
#include "shares.h"
#include "state_file.h"

namespace vorn {
namespace {

constexpr char kExportedShares[] = "/var/lib/vorn/exported-shares";

using Directories = std::set<std::string>;

Result<Directories> ReadRemembered(Box& box) {
  const Result<StoredFile> file = box.Read(kExportedShares);
  if (!file.ok()) return file.status();
  Directories remembered;
  for (const std::string_view line : LinesOf(file->text)) remembered.emplace(line);
  return remembered;
}

Status Remember(Box& box, const Directories& directories) {
  std::string text;
  for (const std::string& directory : directories) {
    if (directory.find('\n') == std::string::npos) text += directory + "\n";
  }
  return StoreState(box, kExportedShares, text);
}

Status Withdraw(Box& box, const std::string& directory) {
  Status status = WriteShareRules(box, directory, nullptr);
  if (status.ok()) {
    LogDone(LOG_WARNING, directory + " is no share any more; its export rules were removed");
  }
  return status;
}

void NameLeft(const std::string& directory) {
  LogDone(LOG_WARNING, directory + " is exported although it is no share any more; remove its line from " +
                           kExportsFile + ", or set withdraw_left_shares = yes in /etc/vorn/platform.conf");
}

// The exported directories that are or were shares, with whether each is one now. nullopt if there is no shares.conf.
using ExportedShares = std::optional<std::map<std::string, bool>>;

Result<ExportedShares> FindExportedShares(Box& box, const ExportsDocument& exports) {
  const Result<std::vector<std::string>> paths = ListSharePaths(box);
  if (!paths.ok() && paths.status().code() == ENOENT) return ExportedShares();
  if (!paths.ok()) return paths.status();
  const Result<Directories> remembered = ReadRemembered(box);
  if (!remembered.ok()) return remembered.status();
  const BoxPaths links(box.root());
  PathResolver resolver(links);
  Directories shares;
  for (const std::string& path : *paths) shares.insert(resolver.Resolve(NormalExportPath(path)));
  std::map<std::string, bool> exported;
  const auto lines = exports.Lines();
  for (const ExportLine& line : *lines) {
    const std::string directory = resolver.Resolve(line.path);
    const bool is_share = shares.count(directory) != 0;
    if (is_share || remembered->count(directory) != 0) exported[directory] = is_share;
  }
  return ExportedShares(std::move(exported));
}

}  // namespace

Result<bool> CheckLeftShares(Box& box, const ExportsDocument& exports) {
  const auto settings = PlatformSettings::Load(box);
  if (!settings.ok()) return settings.status();
  const Result<ExportedShares> exported = FindExportedShares(box, exports);
  if (!exported.ok()) return exported.status();
  if (!*exported) return false;
  bool withdrawn = false;
  Directories directories;
  for (const auto& [directory, is_share] : **exported) {
    directories.insert(directory);
    if (is_share) continue;
    if (!(*settings)->withdraw_left_shares) {
      NameLeft(directory);
    } else if (Status status = Withdraw(box, directory); !status.ok()) {
      return status;
    } else {
      withdrawn = true;
    }
  }
  if (Status status = Remember(box, directories); !status.ok()) return status;
  return withdrawn;
}

Result<std::vector<std::string>> FindLeftShares(Box& box, const ExportsDocument& exports) {
  const Result<ExportedShares> exported = FindExportedShares(box, exports);
  if (!exported.ok()) return exported.status();
  std::vector<std::string> left;
  if (!*exported) return left;
  for (const auto& [directory, is_share] : **exported) {
    if (!is_share) left.push_back(directory);
  }
  return left;
}

}  // namespace vorn

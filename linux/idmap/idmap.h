// The ID map of a box: idmapd.conf(5), as libnfsidmap reads it over all its files.
#ifndef VORN_LINUX_IDMAP_IDMAP_H
#define VORN_LINUX_IDMAP_IDMAP_H

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "box.h"
#include "ini_files.h"
#include "status.h"
#include "text_pairs.h"

namespace vorn {

inline constexpr char kIDMapFile[] = "/etc/idmapd.conf";

// One reading of the ID map: immutable, thread-safe, shared by all readers of one version of the files.
//
// Principals, local names and the domain are shown as valid UTF-8: malformed bytes appear as U+FFFD. Two principals
// that would look the same are distinguished by further U+FFFD at the end of the later one.
class IDMap {
 public:
  explicit IDMap(SharedIniFiles files);

  // The domain that is configured; nullopt if there is none.
  const std::optional<std::string>& domain() const { return domain_; }

  // The static mappings in the order of the files: from the principal, as shown, to the name of a local user, as
  // shown.
  const std::shared_ptr<const TextPairs>& mappings() const { return mappings_; }

  // The mapping at an index of mappings(), as it is in the files.
  const IniFound& Stored(std::size_t index) const { return stored_[index]; }

  // The mappings whose principal or local name contains the string, without regard to case. The last result is
  // remembered.
  std::shared_ptr<const TextPairs> Matching(std::string_view filter) const;

  const IniFiles& files() const { return *files_; }

 private:
  class Search;

  SharedIniFiles files_;
  std::optional<std::string> domain_;
  std::vector<IniFound> stored_;
  std::shared_ptr<const TextPairs> mappings_;
  std::shared_ptr<Search> search_;
};

// The ID map in force. Parsed again only if a file has changed. Plug-ins of libnfsidmap that are configured and
// missing are then logged.
Result<std::shared_ptr<const IDMap>> ReadIDMap(Box& box, const std::string& path = kIDMapFile);

// The parts of the ID map that a change stores; nullopt and nullptr leave a part as it is.
struct IDMapChange {
  std::optional<std::string> domain;          // "" removes the configured domain
  std::shared_ptr<const TextPairs> mappings;  // as shown by IDMap
};

// Changes the idmapd.conf at `path`: only what differs from what is in force. If a mapping is added or changed, the
// method for static mappings (translation_methods.h) becomes the first one; other mappings that take effect by this are
// logged and become warnings of the call, one by one. Comments, foreign settings and lines that libnfsidmap ignores
// stay as they are.
//
// Before anything is written it fails
// - with kRefusedText for a string that the file cannot represent, that libnfsidmap has no room for, that looks like
//   another one, and for two principals that differ only in case, which libnfsidmap does not distinguish;
// - with kOverridden, naming file and line, if another file decides over a value;
// - with kChangedBehind if a file was changed since the configuration context of this thread read it.
// Afterwards what is in force is read back.
Status WriteIDMap(Box& box, const std::string& path, const IDMapChange& change);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_IDMAP_H

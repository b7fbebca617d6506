#include "folder_listing.h"

#include <algorithm>

#include "core.h"
#include "log.h"
#include "owned.h"
#include "shared_folders.h"

std::optional<std::vector<Folder>> ReadFolders(const CallSite& site) {
  StringHash shares(KLIBCSzHashAlloc(0));
  StringList names(KLIBCSzListAlloc(0));
  if (!shares || !names || VORNShareEnum(shares.slot()) < 0 || KLIBCSzHashEnumKey(shares.get(), names.slot()) < 0) {
    LOG_ERROR_AT(site, "Failed to VORNShareEnum, vornerr=[0x%04X]", KLIBCErrGet());
    return std::nullopt;
  }
  std::vector<Folder> folders;
  folders.reserve(static_cast<std::size_t>(names.get()->count));
  for (int i = 0; i < names.get()->count; ++i) {
    const char* const name = KLIBCSzListGet(names.get(), i);
    folders.push_back({name, KLIBCSzHashGetValue(shares.get(), name)});
  }
  std::sort(folders.begin(), folders.end(), [](const Folder& a, const Folder& b) { return a.name < b.name; });
  return folders;
}

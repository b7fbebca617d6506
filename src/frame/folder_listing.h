// The table of shared folders.
#ifndef VORN_SRC_FOLDER_LISTING_H
#define VORN_SRC_FOLDER_LISTING_H

#include <optional>
#include <string>
#include <vector>

#include "handler.h"

struct Folder {
  std::string name;
  std::string path;
};

// Returns all shared folders in the order of the bytes of their names. If they cannot be read, logs that for the call
// site and returns std::nullopt. Thread-safe.
std::optional<std::vector<Folder>> ReadFolders(const CallSite& site);

#endif  // VORN_SRC_FOLDER_LISTING_H

// Changing the table of shared folders. Our own addition to the contract: the module "VORN.Core.Share" needs it.
// Thread-safe.
#ifndef VORN_PLATFORM_SHARED_FOLDERS_H
#define VORN_PLATFORM_SHARED_FOLDERS_H

#include "core.h"

extern "C" {

// Adds all shared folders to the hash: the absolute path by name. The hash may move. Returns a negative value on
// failure.
int VORNShareEnum(KLIBSZHASH** hash);

enum {
  VORNSHARE_FAILED = -1,     // a failure other than the following ones
  VORNSHARE_EXISTS = -2,     // the name, or one that differs only in case, or the folder is shared already
  VORNSHARE_NO_FOLDER = -3,  // there is no folder at the path
  VORNSHARE_NO_SHARE = -4    // there is no shared folder with this name
};

// Shares the existing folder at the absolute `path` under a new name. A path with symbolic links stands for the folder
// that they lead to. Nobody may mount the folder before it has export rules. Returns one of the values above on
// failure, and then changes nothing.
int VORNShareCreate(const char* name, const char* path);

// Removes the entry with this exact name, never the folder. Export rules of the folder stay in force: a caller removes
// them first, and holds the configuration lock (VornConf, core.h) from its check on. Returns one of the values above
// on failure, and then changes nothing.
int VORNShareDelete(const char* name);

}  // extern "C"

#endif  // VORN_PLATFORM_SHARED_FOLDERS_H

// Owners of what the platform hands out: released by the platform's own operation, on every path.
#ifndef VORN_SRC_OWNED_H
#define VORN_SRC_OWNED_H

#include <memory>

#include "nfsconf.h"

template <typename T, void (*kFree)(T*)>
struct Release {
  void operator()(T* object) const { kFree(object); }
};

using IDMap = std::unique_ptr<_tag_nfs_id_map_, Release<_tag_nfs_id_map_, VORNNFSIDMapFree>>;

#endif  // VORN_SRC_OWNED_H

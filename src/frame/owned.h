// Owners of the platform's objects. Each releases its object with the platform's operation for it.
#ifndef VORN_SRC_OWNED_H
#define VORN_SRC_OWNED_H

#include <memory>

#include "nfsconf.h"
#include "share.h"

template <typename T, void (*kFree)(T*)>
struct Release {
  void operator()(T* object) const { kFree(object); }
};

using ExportRules = std::unique_ptr<ExportRuleList, Release<ExportRuleList, VORNNFSRuleExtFree>>;
using IDMap = std::unique_ptr<_tag_nfs_id_map_, Release<_tag_nfs_id_map_, VORNNFSIDMapFree>>;
using Keytab = std::unique_ptr<KeytabEntry, Release<KeytabEntry, VORNNFSKeytabInfoFree>>;
using Share = std::unique_ptr<VORNSHARE, Release<VORNSHARE, VORNShareFree>>;

// Owns an object that platform operations may move. Never store its address: use get() again after each
// operation that was given slot(). Not thread-safe.
template <typename T, void (*kFree)(T*)>
class Movable {
 public:
  explicit Movable(T* object) : object_(object) {}
  ~Movable() {
    if (object_ != nullptr) kFree(object_);
  }
  Movable(const Movable&) = delete;
  Movable& operator=(const Movable&) = delete;

  explicit operator bool() const { return object_ != nullptr; }
  T* get() const { return object_; }  // valid until the next slot()
  T** slot() { return &object_; }     // for operations that may move the object

 private:
  T* object_;
};

using StringList = Movable<KLIBSZLIST, KLIBCSzListFree>;
using StringHash = Movable<KLIBSZHASH, KLIBCSzHashFree>;

#endif  // VORN_SRC_OWNED_H

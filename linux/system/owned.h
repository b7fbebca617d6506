// Owners of objects of C libraries.
#ifndef VORN_LINUX_OWNED_H
#define VORN_LINUX_OWNED_H

#include <memory>

namespace vorn {

template <auto kRelease>
struct ReleaseWith {
  template <typename T>
  void operator()(T* object) const {
    kRelease(object);
  }
};

// Owns an object of a C library and releases it with the library's function `kRelease`, whose result is ignored.
template <typename T, auto kRelease>
using Owned = std::unique_ptr<T, ReleaseWith<kRelease>>;

}  // namespace vorn

#endif  // VORN_LINUX_OWNED_H

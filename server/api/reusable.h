// Objects that cost more to construct than to use.
#ifndef VORN_SERVER_REUSABLE_H
#define VORN_SERVER_REUSABLE_H

#include <memory>
#include <mutex>
#include <utility>
#include <vector>

namespace vorn::server {

// Keeps objects between their uses, as many as were used at the same time. Thread-safe. An object per thread
// (thread_local) is not possible: the C library ends the process if there is no memory to register its destructor.
template <typename T>
class Reusable {
 public:
  explicit Reusable(std::unique_ptr<T> (*make)()) : make_(make) {}

  // Calls `use` with an object that no other thread uses, and returns its result. An object whose use ends with an
  // exception is destroyed.
  template <typename Use>
  auto With(Use use) {
    std::unique_ptr<T> object = Take();
    auto result = use(*object);
    Keep(std::move(object));
    return result;
  }

 private:
  std::unique_ptr<T> Take() {
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      if (!kept_.empty()) {
        std::unique_ptr<T> object = std::move(kept_.back());
        kept_.pop_back();
        return object;
      }
    }
    return make_();
  }

  void Keep(std::unique_ptr<T> object) {
    const std::lock_guard<std::mutex> lock(mutex_);
    kept_.push_back(std::move(object));
  }

  std::unique_ptr<T> (*const make_)();
  std::mutex mutex_;
  std::vector<std::unique_ptr<T>> kept_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_REUSABLE_H

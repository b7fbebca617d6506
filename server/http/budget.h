// A shared limit on a resource of requests, for example the bytes of their bodies.
#ifndef VORN_SERVER_BUDGET_H
#define VORN_SERVER_BUDGET_H

#include <cstddef>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

class Budget;

// A part of a budget, returned to it by the destructor. The budget must outlive it.
class Charge {
 public:
  Charge() = default;
  Charge(Charge&& other) noexcept;
  Charge& operator=(Charge&& other) noexcept;
  ~Charge();

  std::size_t amount() const { return amount_; }

 private:
  friend class Budget;
  Charge(Budget& budget, std::string peer, std::size_t amount);

  Budget* budget_ = nullptr;
  std::string peer_;
  std::size_t amount_ = 0;
};

// Thread-safe.
class Budget {
 public:
  // `per_peer` is the largest share of one peer.
  Budget(std::size_t total, std::size_t per_peer) : total_(total), per_peer_(per_peer) {}
  Budget(const Budget&) = delete;
  Budget& operator=(const Budget&) = delete;

  // Returns std::nullopt if the budget or the peer's share of it does not suffice. An empty `peer` is limited by
  // the total alone.
  std::optional<Charge> Take(std::string_view peer, std::size_t amount);

  // Whether Take() returns a charge when nothing else is taken. If it does not, waiting is useless.
  bool HasRoomFor(std::string_view peer, std::size_t amount) const;

  std::size_t used() const;
  std::size_t total() const { return total_; }

 private:
  friend class Charge;
  void Return(const std::string& peer, std::size_t amount) noexcept;

  const std::size_t total_;
  const std::size_t per_peer_;
  mutable std::mutex mutex_;
  std::size_t used_ = 0;
  std::map<std::string, std::size_t, std::less<>> by_peer_;  // peers that have taken something
};

}  // namespace vorn::server

#endif  // VORN_SERVER_BUDGET_H

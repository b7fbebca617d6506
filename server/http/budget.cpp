#include "budget.h"

#include <functional>
#include <utility>

namespace vorn::server {

Charge::Charge(Budget& budget, std::string peer, std::size_t amount)
    : budget_(&budget), peer_(std::move(peer)), amount_(amount) {}

Charge::Charge(Charge&& other) noexcept
    : budget_(std::exchange(other.budget_, nullptr)),
      peer_(std::move(other.peer_)),
      amount_(std::exchange(other.amount_, 0)) {}

Charge& Charge::operator=(Charge&& other) noexcept {
  std::swap(budget_, other.budget_);
  std::swap(peer_, other.peer_);
  std::swap(amount_, other.amount_);
  return *this;
}

Charge::~Charge() {
  if (budget_ != nullptr) budget_->Return(peer_, amount_);
}

std::optional<Charge> Budget::Take(std::string_view peer, std::size_t amount) {
  std::string key(peer);
  const std::lock_guard<std::mutex> lock(mutex_);
  if (amount > total_ - used_) return std::nullopt;
  if (!key.empty()) {
    const auto held = by_peer_.find(key);
    if (amount > per_peer_ - (held == by_peer_.end() ? 0 : held->second)) return std::nullopt;
    by_peer_[key] += amount;
  }
  used_ += amount;
  return Charge(*this, std::move(key), amount);
}

bool Budget::HasRoomFor(std::string_view peer, std::size_t amount) const {
  return amount <= total_ && (peer.empty() || amount <= per_peer_);
}

std::size_t Budget::used() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return used_;
}

void Budget::Return(const std::string& peer, std::size_t amount) noexcept {
  const std::lock_guard<std::mutex> lock(mutex_);
  used_ -= amount;
  const auto held = by_peer_.find(peer);
  if (held == by_peer_.end()) return;  // the charge has no peer
  held->second -= amount;
  if (held->second == 0) by_peer_.erase(held);
}

}  // namespace vorn::server

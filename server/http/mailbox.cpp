#include "mailbox.h"

#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>
#include <utility>

namespace vorn::server {

Mailbox::Mailbox() : event_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  if (!event_) throw std::system_error(errno, std::generic_category(), "eventfd");
}

Mailbox::~Mailbox() {
  // One by one: a chain of owners would be destroyed by recursion.
  for (std::shared_ptr<Letter> letter = TakeAll(); letter;) letter = std::move(letter->next);
}

void Mailbox::Send(std::shared_ptr<Letter> letter) noexcept {
  const std::lock_guard<std::mutex> lock(mutex_);
  Letter* const sent = letter.get();
  const bool first = last_ == nullptr;
  (first ? first_ : last_->next) = std::move(letter);
  last_ = sent;
  if (first) Wake();
}

// Writing fails only if the counter is at its maximum, and then the descriptor is readable.
void Mailbox::Wake() noexcept { (void)eventfd_write(event_.get(), 1); }

void Mailbox::Deliver() {
  for (std::shared_ptr<Letter> letter = TakeAll(); letter;) {
    std::shared_ptr<Letter> next = std::move(letter->next);
    if (letter->deliver) letter->deliver(std::move(letter->response));
    letter = std::move(next);
  }
}

std::shared_ptr<Letter> Mailbox::TakeAll() noexcept {
  const std::lock_guard<std::mutex> lock(mutex_);
  last_ = nullptr;
  return std::exchange(first_, nullptr);
}

}  // namespace vorn::server

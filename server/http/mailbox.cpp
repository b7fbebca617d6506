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
  // Destroys the letters in a loop, because destroying a chain of owners recurses once per letter.
  for (std::shared_ptr<Letter> letter = TakeAll(); letter;) letter = std::move(letter->next);
}

void Mailbox::Send(std::shared_ptr<Letter> letter) noexcept {
  Letter* const sent = letter.get();
  bool first = false;
  {
    const std::lock_guard<std::mutex> lock(mutex_);
    first = last_ == nullptr;
    (first ? first_ : last_->next) = std::move(letter);
    last_ = sent;
  }
  if (first) Wake();
}

// write(2) fails only if the counter is at its maximum; the descriptor is readable in that case.
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

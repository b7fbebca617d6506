// Passes decisions and responses from any thread to the network thread.
#ifndef VORN_SERVER_MAILBOX_H
#define VORN_SERVER_MAILBOX_H

#include <functional>
#include <memory>
#include <mutex>
#include <optional>

#include "message.h"
#include "unique_fd.h"

namespace vorn::server {

// One delivery. It is allocated before the call runs, so that sending the response cannot fail.
struct Letter {
  std::function<void(std::optional<Response>)> deliver;  // called on the network thread, unless the server has ended
  std::optional<Response> response;
  std::shared_ptr<Letter> next;
};

// Letters are delivered in the order in which they were sent. The server and all possible senders share ownership of
// the mailbox; a letter that is sent after the server's end is dropped.
class Mailbox {
 public:
  // Throws std::system_error if there is no descriptor left.
  Mailbox();
  ~Mailbox();
  Mailbox(const Mailbox&) = delete;
  Mailbox& operator=(const Mailbox&) = delete;

  // An eventfd(2) that is readable while there may be letters, and after Wake().
  int descriptor() const { return event_.get(); }

  // Thread-safe. Each letter is sent at most once.
  void Send(std::shared_ptr<Letter> letter) noexcept;

  // Makes the descriptor readable without a letter. Thread-safe.
  void Wake() noexcept;

  // Delivers all letters that have been sent so far.
  void Deliver();

 private:
  std::shared_ptr<Letter> TakeAll() noexcept;

  const UniqueFd event_;
  std::mutex mutex_;
  std::shared_ptr<Letter> first_;
  Letter* last_ = nullptr;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_MAILBOX_H

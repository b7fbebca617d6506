// An answer that several threads may give; only the first one is sent.
#ifndef VORN_SERVER_PENDING_ANSWER_H
#define VORN_SERVER_PENDING_ANSWER_H

#include <mutex>
#include <string>
#include <utility>

#include "http.h"

namespace vorn::server {

// Thread-safe.
class PendingAnswer {
 public:
  // `caller` becomes the caller of the response, for the access log.
  explicit PendingAnswer(std::string caller = {}) : caller_(std::move(caller)) {}

  void Await(Answer answer) {
    const std::lock_guard<std::mutex> lock(mutex_);
    answer_ = std::move(answer);
  }

  // Answers with `response`. Returns false, without an effect, if an answer was given before.
  bool Give(Response response) {
    Answer answer;
    {
      const std::lock_guard<std::mutex> lock(mutex_);
      answer.swap(answer_);
      if (answer) response.caller.swap(caller_);
    }
    if (!answer) return false;
    answer(std::move(response));
    return true;
  }

 private:
  std::mutex mutex_;
  Answer answer_;
  std::string caller_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_PENDING_ANSWER_H

#include "worker_page.h"

#include <utility>

#include "answer.h"

namespace vorn::server {
namespace {

const char kLane = 0;

// A server without memory is not ready either.
Response Unready(const char* text) noexcept {
  try {
    return Busy(text);
  } catch (...) {
    Response response;
    response.status = 503;
    return response;
  }
}

}  // namespace

void WorkerPage::Run(Answer answer) {
  answer_.Await(std::move(answer));
  try {
    if (pool_.Submit({&kLane, JobSize::kSmall}, shared_from_this(), time_)) return;
  } catch (const std::bad_alloc&) {
  }
  Refuse(Refused::kClosed);
}

void WorkerPage::Work() {
  try {
    answer_.Give(make_());
  } catch (const std::bad_alloc&) {
    Refuse(Refused::kClosed);
  }
}

void WorkerPage::Expire(bool /*running*/) { answer_.Give(Unready("No worker was free in time.")); }

void WorkerPage::Refuse(Refused /*why*/) { answer_.Give(Unready("The server takes no calls.")); }

}  // namespace vorn::server

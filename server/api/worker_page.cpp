#include "worker_page.h"

#include <utility>

#include "answer.h"

namespace vorn::server {
namespace {

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
    const LaneId lane{request_.page, JobSize::kSmall};
    if (pool_.Submit(lane, shared_from_this(), time_, {request_.turn, request_.recent_requests})) return;
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

void WorkerPage::Refuse(Refused /*why*/) { answer_.Give(Unready("The server takes no more requests at the moment.")); }

}  // namespace vorn::server

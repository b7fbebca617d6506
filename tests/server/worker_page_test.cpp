#include "worker_page.h"

#include <gtest/gtest.h>

#include <future>

#include "answer.h"
#include "sandbox.h"

namespace vorn::server {
namespace {

Response MakePage() { return Success(Json::Value()); }

// A job that occupies the pool's only thread until `end` is ready.
class Blocker : public Job {
 public:
  explicit Blocker(std::shared_future<void> end) : end_(std::move(end)) {}
  void Work() override { end_.wait(); }
  void Expire(bool /*running*/) override {}
  void Refuse(Refused /*why*/) override {}

 private:
  const std::shared_future<void> end_;
};

int StatusOf(WorkerPool& pool, std::chrono::milliseconds time, const std::function<Response()>& make = MakePage) {
  const auto status = std::make_shared<std::promise<int>>();  // set_value() may return after the waiter has gone on
  std::make_shared<WorkerPage>(pool, time, make)->Run([status](const Response& answer) {
    status->set_value(answer.status);
  });
  return status->get_future().get();
}

TEST(WorkerPage, IsMadeIfAWorkerIsFreeInTime) {
  WorkerPool::Limits limits;
  limits.threads = 1;
  WorkerPool pool(limits);
  EXPECT_EQ(StatusOf(pool, std::chrono::hours(1)), 200);
  std::promise<void> end;
  pool.Submit({&limits, JobSize::kSmall}, std::make_shared<Blocker>(end.get_future().share()), std::chrono::hours(1));
  EXPECT_EQ(StatusOf(pool, std::chrono::milliseconds(1)), 503);
  end.set_value();
  EXPECT_EQ(StatusOf(pool, std::chrono::hours(1)), 200);
  pool.Close();
  EXPECT_EQ(StatusOf(pool, std::chrono::hours(1)), 503);
}

TEST(WorkerPage, ThatCannotBeMadeForLackOfMemoryIsAnswered503) {
  WorkerPool pool{WorkerPool::Limits{}};
  EXPECT_EQ(StatusOf(pool, std::chrono::hours(1), []() -> Response { throw std::bad_alloc(); }), 503);
}

}  // namespace
}  // namespace vorn::server

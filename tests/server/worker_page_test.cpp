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

const char kPages[2] = "";

// Requests the page. The future receives the status of the answer.
std::future<int> Request(WorkerPool& pool, WorkerPage::Request request, std::chrono::milliseconds time,
                         const std::function<Response()>& make = MakePage) {
  const auto status = std::make_shared<std::promise<int>>();  // set_value() may return after the waiter has gone on
  std::make_shared<WorkerPage>(pool, std::move(request), time, make)->Run([status](const Response& answer) {
    status->set_value(answer.status);
  });
  return status->get_future();
}

int StatusOf(WorkerPool& pool, std::chrono::milliseconds time, const std::function<Response()>& make = MakePage) {
  return Request(pool, {&kPages[0]}, time, make).get();
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

// Each page is the first one's only thread, and two requests may wait.
class FloodOfPages : public testing::Test {
 protected:
  FloodOfPages() {
    blocked_ = Ask(0, "flood");
    EXPECT_TRUE(Eventually([this] { return pool_.load().running == 1; }));
  }
  ~FloodOfPages() override {
    if (blocked_.valid()) Release();
  }
  std::future<int> Ask(int page, const char* peer) {
    const auto wait = [this, page] {
      if (page == 0) released_.wait();
      return MakePage();
    };
    return Request(pool_, {&kPages[page], peer}, std::chrono::hours(1), wait);
  }
  void Release() {
    release_.set_value();
    EXPECT_EQ(blocked_.get(), 200);
  }
  static WorkerPool::Limits TwoOfAPage() {
    WorkerPool::Limits limits;
    limits.lane_threads = 1;
    limits.lane_queue = 2;
    return limits;
  }

 private:
  std::promise<void> release_;
  const std::shared_future<void> released_ = release_.get_future().share();
  std::future<int> blocked_;
  WorkerPool pool_{TwoOfAPage()};
};

TEST_F(FloodOfPages, TakesNoTurnOfAnotherPeer) {
  std::future<int> first = Ask(0, "flood");
  std::future<int> second = Ask(0, "flood");
  EXPECT_EQ(Ask(0, "flood").get(), 503) << "two wait";
  std::future<int> other = Ask(0, "other");
  EXPECT_EQ(second.get(), 503) << "makes room for the other peer";
  Release();
  EXPECT_EQ(first.get(), 200);
  EXPECT_EQ(other.get(), 200);
}

TEST_F(FloodOfPages, TakesNoThreadOfAnotherPage) { EXPECT_EQ(Ask(1, "other").get(), 200); }

}  // namespace
}  // namespace vorn::server

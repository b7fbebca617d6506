#include "access_log.h"

#include <gmock/gmock.h>

#include "echo_service.h"

namespace vorn::server {
namespace {

// A sink that stores the records.
class Kept {
 public:
  AccessLog::Sink sink() {
    return {[this](const AccessRecord& record) {
              const std::lock_guard<std::mutex> lock(mutex_);
              records_.push_back(record);
            },
            [this](const AccessLog::Counts& counts) {
              const std::lock_guard<std::mutex> lock(mutex_);
              busy_ += counts.busy;
              dropped_ += counts.dropped;
            }};
  }
  std::vector<AccessRecord> records() {
    const std::lock_guard<std::mutex> lock(mutex_);
    return records_;
  }
  std::uint64_t busy() {
    const std::lock_guard<std::mutex> lock(mutex_);
    return busy_;
  }

 private:
  std::mutex mutex_;
  std::vector<AccessRecord> records_;
  std::uint64_t busy_ = 0;
  std::uint64_t dropped_ = 0;
};

AccessRecord Example() {
  AccessRecord record;
  record.method = "POST";
  record.target = "/api/\"x\"\n";
  record.status = 200;
  record.bytes = 12;
  record.queued = std::chrono::microseconds(3);
  record.worked = std::chrono::microseconds(45);
  return record;
}

TEST(AccessLog, ALineSaysWhoFromWhereWhatAndHowLong) {
  AccessRecord record = Example();
  EXPECT_EQ(FormatRecord(record), "- unix \"POST /api/\\x22x\\x22\\x0a\" 200 12 bytes, queued 3 us, worked 45 us");
  record.caller = "alice";
  record.peer.credentials = Peer::Credentials{7, 1000, 1000};
  EXPECT_THAT(FormatRecord(record), testing::StartsWith("alice unix uid=1000 \"POST"));
}

TEST(AccessLog, ALineIsBounded) {
  AccessRecord record = Example();
  record.target = std::string(20000, 'x');
  EXPECT_LT(FormatRecord(record).size(), 1200U);
}

TEST(AccessLog, AnswersOfABusyServerAreCounted) {
  Kept kept;
  {
    AccessLog log(kept.sink());
    AccessRecord busy = Example();
    busy.status = 503;
    for (int i = 0; i < 1000; ++i) log.Add(busy);
    log.Add(Example());
  }
  EXPECT_EQ(kept.records().size(), 1U);
  EXPECT_EQ(kept.busy(), 1000U);
}

class AccessLogTest : public HttpTest {};

TEST_F(AccessLogTest, HasOneRecordForEachRequest) {
  Kept kept;
  AccessLog log(kept.sink());
  Start({}, {nullptr, &log});
  Connection client = Connect();
  client.Send(Post("/echo?secret=1", "four") + Get("/no") + "nonsense\r\n\r\n");
  EXPECT_EQ(client.Receive().status, 200);
  EXPECT_EQ(client.Receive().status, 404);
  EXPECT_EQ(client.Receive().status, 400);
  EXPECT_TRUE(Eventually([&] { return kept.records().size() == 3; }));
  server_.reset();
  const std::vector<AccessRecord> records = kept.records();
  EXPECT_EQ(records[0].method + " " + records[0].target, "POST /echo");
  EXPECT_EQ(records[0].status, 200);
  EXPECT_EQ(records[0].bytes, 4U);
  ASSERT_TRUE(records[0].peer.credentials);
  EXPECT_EQ(records[0].peer.credentials->uid, geteuid());
  EXPECT_EQ(records[1].status, 404);
  EXPECT_EQ(records[2].status, 400);
}

TEST_F(AccessLogTest, TellsQueueFromWork) {
  Kept kept;
  AccessLog log(kept.sink());
  Start({}, {nullptr, &log});
  Connection client = Connect();
  client.Send(Post("/hold", "1"));
  const Answer answer = service_.AwaitHeld();
  std::this_thread::sleep_for(std::chrono::milliseconds(30));
  Response response{200, "x"};
  response.caller = "token:backup";
  response.begun = std::chrono::steady_clock::now();
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  answer(response);
  EXPECT_EQ(client.Receive().status, 200);
  EXPECT_TRUE(Eventually([&] { return kept.records().size() == 1; }));
  const AccessRecord record = kept.records().front();
  EXPECT_GE(record.queued, std::chrono::milliseconds(30));
  EXPECT_GE(record.worked, std::chrono::milliseconds(20));
  EXPECT_EQ(record.caller, "token:backup");
  server_.reset();
}

}  // namespace
}  // namespace vorn::server

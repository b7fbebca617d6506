#include "access_log.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <climits>

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
            [this] { ++batches_; },
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
  int batches() const { return batches_; }
  std::uint64_t busy() {
    const std::lock_guard<std::mutex> lock(mutex_);
    return busy_;
  }

 private:
  std::mutex mutex_;
  std::vector<AccessRecord> records_;
  std::atomic<int> batches_{0};
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

TEST(AccessLog, RecordsAreCollectedBeforeTheyAreWritten) {
  Kept kept;
  {
    AccessLog log(kept.sink());
    for (int i = 0; i < 1000; ++i) log.Add(Example());
  }
  EXPECT_EQ(kept.records().size(), 1000U);
  EXPECT_LT(kept.batches(), 100);
}

TEST(AccessLog, ManyLinesAreWrittenAtATimeAndNoneIsDivided) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_DIRECT), 0);  // keeps apart what was written apart
  const UniqueFd reader(ends[0]);
  UniqueFd writer(ends[1]);
  AccessLog log(LineSink(writer.get()));
  for (int i = 0; i < 1000; ++i) log.Add(Example());
  const std::string line = "vornd[" + std::to_string(getpid()) + "]: " + FormatRecord(Example()) + "\n";
  int writes = 0;
  for (long lines = 0; lines < 1000; ++writes) {
    char text[PIPE_BUF];
    const ssize_t size = read(reader.get(), text, sizeof text);
    ASSERT_GT(size, 0);
    ASSERT_EQ(static_cast<std::size_t>(size) % line.size(), 0U);
    ASSERT_EQ(std::string(text, line.size()), line);
    lines += size / static_cast<ssize_t>(line.size());
  }
  EXPECT_LT(writes, 150);
}

// Returns a socket at the journal's address, in a mount namespace of this process; an empty one if that is not
// permitted here.
UniqueFd OpenPrivateJournal() {
  const int namespaces = CLONE_NEWNS | (geteuid() == 0 ? 0 : CLONE_NEWUSER);
  if (unshare(namespaces) != 0 || mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr) != 0 ||
      mount("tmpfs", "/run", "tmpfs", 0, nullptr) != 0) {
    return {};
  }
  mkdir("/run/systemd", 0755);
  mkdir("/run/systemd/journal", 0755);
  const sockaddr_un address{AF_UNIX, "/run/systemd/journal/socket"};
  UniqueFd socket(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0));
  if (bind(socket.get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) return {};
  return socket;
}

TEST(AccessLog, AJournalEntryHasAFieldForEachValue) {
  const UniqueFd journal = OpenPrivateJournal();
  if (!journal) GTEST_SKIP() << "mount namespaces are not permitted here";
  AccessRecord record = Example();
  record.caller = "alice";
  record.peer.credentials = Peer::Credentials{7, 1000, 1000};
  AccessLog log(JournalSink());
  log.Add(record);
  log.Add(Example());
  char text[4096];
  const std::string first(text, static_cast<std::size_t>(std::max<ssize_t>(0, read(journal.get(), text, sizeof text))));
  EXPECT_EQ(first, "MESSAGE=" + FormatRecord(record) +
                       "\nPRIORITY=6\nSYSLOG_IDENTIFIER=vornd\nVORN_CALLER=alice\nVORN_PEER=unix\nVORN_PEER_UID=1000\n"
                       "VORN_PEER_PID=7\nVORN_METHOD=POST\nVORN_TARGET=/api/\\x22x\\x22\\x0a\nVORN_STATUS=200\n"
                       "VORN_BYTES=12\nVORN_QUEUED_US=3\nVORN_WORKED_US=45\n");
  const std::string second(text,
                           static_cast<std::size_t>(std::max<ssize_t>(0, read(journal.get(), text, sizeof text))));
  EXPECT_THAT(second, testing::Not(testing::HasSubstr("UID")));
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

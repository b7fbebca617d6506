#include "server_metrics.h"

#include <gmock/gmock.h>

#include <optional>

#include "sandbox.h"

namespace vorn::server {
namespace {

using testing::HasSubstr;

void Nothing(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}

const Route kGet{{"Nfs", 1, "get", Nothing}, nullptr, {}};
const Route kSet{{"Nfs", 1, "set", Nothing}, nullptr, {}};

TEST(Metrics, CountAnswersByMethodAndCode) {
  CallMetrics calls;
  calls.CountAnswer(kGet, 0);
  calls.CountAnswer(kGet, 0);
  calls.CountAnswer(kSet, 2301);
  const std::string text = WriteMetrics(calls, Workers(), {});
  EXPECT_THAT(text, HasSubstr("vorn_calls_total{api=\"Nfs\",code=\"0\",method=\"get\",version=\"1\"} 2\n"));
  EXPECT_THAT(text, HasSubstr("vorn_calls_total{api=\"Nfs\",code=\"2301\",method=\"set\",version=\"1\"} 1\n"));
}

TEST(Metrics, HaveAHistogramOfDurations) {
  CallMetrics calls;
  calls.AddDuration(kGet, std::chrono::milliseconds(1));
  calls.AddDuration(kGet, std::chrono::seconds(2));
  const std::string text = WriteMetrics(calls, Workers(), {});
  EXPECT_THAT(text, HasSubstr("vorn_call_duration_seconds_count{api=\"Nfs\",method=\"get\",version=\"1\"} 2\n"));
  EXPECT_THAT(text, HasSubstr("le=\"0.002\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("le=\"5\"} 2\n"));
}

TEST(Metrics, OfSourcesHaveOneFamilyForEachName) {
  const auto source = [] {
    return std::vector<VORN::Metric>{
        {"bytes_total", "Bytes", VORN::Metric::Kind::kCounter, {{"direction", "read"}}, 7},
        {"bytes_total", "Bytes", VORN::Metric::Kind::kCounter, {{"direction", "written"}}, 8},
        {"threads", "Threads", VORN::Metric::Kind::kGauge, {}, 9},
    };
  };
  EXPECT_THAT(WriteMetrics(CallMetrics(), Workers(), {source}),
              testing::EndsWith("# HELP bytes_total Bytes\n# TYPE bytes_total counter\n"
                                "bytes_total{direction=\"read\"} 7\nbytes_total{direction=\"written\"} 8\n"
                                "# HELP threads Threads\n# TYPE threads gauge\nthreads 9\n"));
}

TEST(Metrics, OfTheWorkersCountTheCalls) {
  EXPECT_THAT(WriteMetrics(CallMetrics(), Workers(), {}), HasSubstr("vorn_calls_waiting{kind=\"changing\"} 0\n"));
}

TEST(Metrics, OfTheProcessArePositive) {
  for (const VORN::Metric& metric : ProcessMetrics()) EXPECT_GT(metric.value, 0) << metric.name;
}

TEST(Metrics, OfUploadsCountTheFilesThatExist) {
  const Sandbox sandbox;
  std::string error;
  const auto folder = UploadFolder::Open(sandbox.File("uploads"), &error);
  ASSERT_TRUE(folder) << error;
  const auto page = [&folder] {
    return WriteMetrics(CallMetrics(), Workers(), {[&folder] { return UploadMetrics(*folder); }});
  };
  {
    std::optional<Upload> first = folder->Create();
    std::optional<Upload> second = folder->Create();
    EXPECT_TRUE(first->Append("1234") && second->Append("56"));
    EXPECT_THAT(page(), HasSubstr("\nvorn_uploads 2\n"));
    EXPECT_THAT(page(), HasSubstr("\nvorn_upload_bytes 6\n"));
  }
  EXPECT_THAT(page(), HasSubstr("\nvorn_uploads 0\n"));
}

TEST(Metrics, OfTheTransportCountStatusesAndBudgets) {
  AccessLog log({[](const AccessRecord& /*record*/) {}, [] {}, [](const AccessLog::Counts& /*counts*/) {}});
  AccessRecord record;
  for (const int status : {200, 503, 200}) {
    record.status = status;
    log.Add(record);
  }
  Budget budget(100, 100);
  const auto charge = budget.Take("", 30);
  const std::string text = WriteMetrics(CallMetrics(), Workers(), {[&] {
                                          return HttpMetrics(log, {{"bodies", budget}});
                                        }});
  EXPECT_THAT(text, HasSubstr("vorn_http_responses_total{status=\"200\"} 2\n"));
  EXPECT_THAT(text, HasSubstr("vorn_http_responses_total{status=\"503\"} 1\n"));
  EXPECT_THAT(text, HasSubstr("vorn_budget_bytes{budget=\"bodies\"} 100\n"));
  EXPECT_THAT(text, HasSubstr("vorn_budget_used_bytes{budget=\"bodies\"} 30\n"));
}

}  // namespace
}  // namespace vorn::server

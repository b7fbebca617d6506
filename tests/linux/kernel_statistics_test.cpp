#include "kernel_statistics.h"

#include <gmock/gmock.h>

#include <map>

#include "metrics.h"
#include "temporary_root.h"

namespace vorn {
namespace {

// The format of Linux 6.1, with fewer operations of NFSv4.
constexpr char kText[] =
    "rc 1 2 3\n"
    "fh 0 0 0 0 0\n"
    "io 4096 8192\n"
    "th 8 0 0.000 0.000 0.000 0.000 0.000 0.000 0.000 0.000 0.000 0.000\n"
    "ra 32 0 0 0 0 0 0 0 0 0 0 0\n"
    "net 40 0 40 5\n"
    "rpc 38 3 1 2 0\n"
    "proc3 22 7 6 5 4 3 2 1 0 0 0 0 0 0 0 0 0 0 0 0 0 0 9\n"
    "proc4 2 1 30\n"
    "proc4ops 10 0 0 0 11 12 13 14 15 16 17\n";

std::map<std::string, std::uint64_t> CountsOf(const KernelStatistics& statistics, const std::string& version) {
  std::map<std::string, std::uint64_t> counts;
  for (const auto& operation : statistics.operations) {
    if (operation.version == version) counts[operation.name] = operation.count;
  }
  return counts;
}

TEST(KernelStatistics, AreReadLineByLine) {
  const KernelStatistics statistics = ParseKernelStatistics(kText);
  EXPECT_EQ(statistics.threads, 8U);
  EXPECT_EQ(statistics.bytes_read, 4096U);
  EXPECT_EQ(statistics.bytes_written, 8192U);
  EXPECT_EQ(statistics.calls, 38U);
  EXPECT_EQ(statistics.bad_format, 1U);
  EXPECT_EQ(statistics.bad_authentication, 2U);
  EXPECT_EQ(statistics.tcp_connections, 5U);
  EXPECT_EQ(statistics.reply_cache.hits, 1U);
  EXPECT_EQ(statistics.reply_cache.misses, 2U);
  EXPECT_EQ(statistics.reply_cache.uncached, 3U);
}

TEST(KernelStatistics, NameTheOperationsOfBothVersions) {
  const KernelStatistics statistics = ParseKernelStatistics(kText);
  const auto version3 = CountsOf(statistics, "3");
  EXPECT_EQ(version3.size(), 22U);
  EXPECT_EQ(version3.at("null"), 7U);
  EXPECT_EQ(version3.at("lookup"), 4U);
  EXPECT_EQ(version3.at("commit"), 9U);
  const auto version4 = CountsOf(statistics, "4");
  EXPECT_EQ(version4, (std::map<std::string, std::uint64_t>{{"access", 11},
                                                            {"close", 12},
                                                            {"commit", 13},
                                                            {"create", 14},
                                                            {"delegpurge", 15},
                                                            {"delegreturn", 16},
                                                            {"getattr", 17}}));
}

TEST(KernelStatistics, OfAnUnknownKernelAreZero) {
  for (const char* text : {"", "\n\n", "th\n", "th x\nio -\nnet 1\n", "proc3\nproc4ops 3\n", "new 1 2 3\n"}) {
    const KernelStatistics statistics = ParseKernelStatistics(text);
    EXPECT_EQ(statistics.threads, 0U) << text;
    EXPECT_EQ(statistics.tcp_connections, 0U) << text;
    EXPECT_TRUE(statistics.operations.empty()) << text;
  }
}

std::vector<std::string> NamesOfMetrics() {
  std::vector<std::string> names;
  for (const VORN::Metric& metric : VORN::ReadMetrics()) {
    if (names.empty() || names.back() != metric.name) names.push_back(metric.name);
  }
  return names;
}

TEST(Metrics, OfABoxWithoutANfsServerHaveTheEnabledStateAndItsHealth) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\n");
  EXPECT_THAT(NamesOfMetrics(), testing::ElementsAre("vorn_nfs_enabled", "vorn_health_not_checked"));
}

TEST(Metrics, AreGroupedByName) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\n");
  root.Write("/proc/net/rpc/nfsd", kText);
  EXPECT_THAT(NamesOfMetrics(), testing::ElementsAre("vorn_nfs_enabled", "vorn_health_not_checked", "vorn_nfs_threads",
                                                     "vorn_nfs_bytes_total", "vorn_nfs_tcp_connections_total",
                                                     "vorn_nfs_rpc_calls_total", "vorn_nfs_rpc_refused_total",
                                                     "vorn_nfs_reply_cache_total", "vorn_nfs_operations_total"));
}

TEST(Metrics, CountTheFindingsOfTheLastCheck) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\n");
  root.Write("/etc/vorn/shares.conf", "[shares]\na = /srv/a\nb = /srv/b\n");
  for (int i = 0; i < 2; ++i) {
    std::map<std::string, double> findings;
    for (const VORN::Metric& metric : VORN::ReadMetrics()) {
      if (metric.name == "vorn_health_findings") findings[metric.labels[0].second] = metric.value;
    }
    EXPECT_EQ(findings, (std::map<std::string, double>{{"missing_folder", 2}}));
    root.Write("/srv/a/file", "");  // the check is not made again
  }
}

}  // namespace
}  // namespace vorn

#include "metrics.h"

#include <chrono>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "current_box.h"
#include "health.h"
#include "health_counts.h"
#include "kernel_statistics.h"

namespace VORN {
namespace {

using Labels = std::vector<std::pair<std::string, std::string>>;

class List {
 public:
  void Gauge(const char* name, const char* help, double value, Labels labels = {}) {
    Add(Metric::Kind::kGauge, name, help, value, std::move(labels));
  }
  void Counter(const char* name, const char* help, std::uint64_t value, Labels labels = {}) {
    Add(Metric::Kind::kCounter, name, help, static_cast<double>(value), std::move(labels));
  }
  std::vector<Metric> Take() { return std::move(metrics_); }

 private:
  void Add(Metric::Kind kind, const char* name, const char* help, double value, Labels labels) {
    metrics_.push_back({name, help, kind, std::move(labels), value});
  }

  std::vector<Metric> metrics_;
};

void AddEnabledState(vorn::Box& box, List* list) {
  const vorn::Result<vorn::Engine*> engine = box.engine();
  if (!engine.ok()) return;
  const vorn::Result<bool> enabled = (*engine)->IsEnabled();
  if (enabled.ok()) list->Gauge("vorn_nfs_enabled", "Whether NFS is started at boot", *enabled ? 1 : 0);
}

void AddTraffic(const vorn::KernelStatistics& kernel, List* list) {
  list->Gauge("vorn_nfs_threads", "Threads of the kernel's NFS server; 0 while it does not serve",
              static_cast<double>(kernel.threads));
  constexpr char kBytes[] = "Bytes that clients have transferred";
  list->Counter("vorn_nfs_bytes_total", kBytes, kernel.bytes_read, {{"direction", "read"}});
  list->Counter("vorn_nfs_bytes_total", kBytes, kernel.bytes_written, {{"direction", "written"}});
  list->Counter("vorn_nfs_tcp_connections_total", "TCP connections that clients have opened", kernel.tcp_connections);
  list->Counter("vorn_nfs_rpc_calls_total", "RPC calls that the NFS server has received", kernel.calls);
}

void AddRefusedCalls(const vorn::KernelStatistics& kernel, List* list) {
  constexpr char kRefused[] = "RPC calls that the NFS server has refused";
  list->Counter("vorn_nfs_rpc_refused_total", kRefused, kernel.bad_format, {{"reason", "format"}});
  list->Counter("vorn_nfs_rpc_refused_total", kRefused, kernel.bad_authentication, {{"reason", "authentication"}});
}

void AddReplyCache(const vorn::KernelStatistics& kernel, List* list) {
  constexpr char kCache[] = "Requests by what the cache of replies to repeated requests did";
  list->Counter("vorn_nfs_reply_cache_total", kCache, kernel.reply_cache.hits, {{"result", "hit"}});
  list->Counter("vorn_nfs_reply_cache_total", kCache, kernel.reply_cache.misses, {{"result", "miss"}});
  list->Counter("vorn_nfs_reply_cache_total", kCache, kernel.reply_cache.uncached, {{"result", "uncached"}});
}

void AddOperations(const vorn::KernelStatistics& kernel, List* list) {
  for (const auto& operation : kernel.operations) {
    list->Counter("vorn_nfs_operations_total", "NFS operations by version and name", operation.count,
                  {{"version", operation.version}, {"operation", operation.name}});
  }
}

// The last check of the current root. Never destroyed: other threads may still read figures while the process exits.
vorn::RecentHealth& HealthOf(const std::string& root) {
  constexpr std::chrono::minutes kAge{1};
  static auto* mutex = new std::mutex;
  static auto* checks = new std::map<std::string, std::unique_ptr<vorn::RecentHealth>>;
  const std::lock_guard lock(*mutex);
  std::unique_ptr<vorn::RecentHealth>& recent = (*checks)[root];
  if (recent == nullptr) recent = std::make_unique<vorn::RecentHealth>(CheckHealth, kAge);
  return *recent;
}

void AddHealth(const vorn::Box& box, List* list) {
  const std::optional<vorn::HealthCounts> counts = HealthOf(box.root().directory()).Get();
  if (!counts) return;
  for (const auto& [finding, count] : counts->findings) {
    list->Gauge("vorn_health_findings", "Findings of the last check by kind and severity", count,
                {{"kind", finding.first}, {"severity", finding.second}});
  }
  for (const auto& [kind, count] : counts->not_checked) {
    list->Gauge("vorn_health_not_checked", "Checks that could not be made, or not completely", count, {{"kind", kind}});
  }
}

}  // namespace

std::vector<Metric> ReadMetrics() {
  List list;
  vorn::Box& box = vorn::CurrentBox();
  AddEnabledState(box, &list);
  AddHealth(box, &list);
  const vorn::Result<vorn::StoredFile> file = box.Read(vorn::kKernelStatistics);
  if (!file.ok() || !file->version.exists) return list.Take();
  const vorn::KernelStatistics kernel = vorn::ParseKernelStatistics(file->text);
  AddTraffic(kernel, &list);
  AddRefusedCalls(kernel, &list);
  AddReplyCache(kernel, &list);
  AddOperations(kernel, &list);
  return list.Take();
}

}  // namespace VORN

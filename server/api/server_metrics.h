// The figures for monitoring, in the text format of Prometheus
// (https://prometheus.io/docs/instrumenting/exposition_formats/).
#ifndef VORN_SERVER_SERVER_METRICS_H
#define VORN_SERVER_SERVER_METRICS_H

#include <prometheus/counter.h>
#include <prometheus/family.h>
#include <prometheus/histogram.h>
#include <prometheus/registry.h>

#include <chrono>
#include <functional>
#include <map>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "access_log.h"
#include "budget.h"
#include "metrics.h"
#include "routes.h"
#include "sessions.h"
#include "upload.h"
#include "worker_pool.h"

namespace vorn::server {

// Counts the calls of the methods. Thread-safe.
class CallMetrics {
 public:
  CallMetrics();

  // Counts an answer to a call. `code` is its error code, 0 for success. The route must outlive this.
  void CountAnswer(const Route& route, int code) noexcept;

  // Adds the time that a call has taken on its worker thread.
  void AddDuration(const Route& route, std::chrono::microseconds duration) noexcept;

  std::vector<prometheus::MetricFamily> Collect() const { return registry_.Collect(); }

 private:
  // The figures of one method. The registry owns them.
  struct Figures {
    std::map<int, prometheus::Counter*> answers;  // by error code
    prometheus::Histogram* durations = nullptr;
  };

  Figures& FiguresOf(const Route& route);
  prometheus::Counter& Answers(const Route& route, int code);
  prometheus::Histogram& Durations(const Route& route);

  prometheus::Registry registry_;
  prometheus::Family<prometheus::Counter>& answers_;
  prometheus::Family<prometheus::Histogram>& durations_;
  std::mutex mutex_;
  std::map<const Route*, Figures> figures_;
};

// Reads some figures. Those of one name are adjacent. Thread-safe.
using MetricsSource = std::function<std::vector<VORN::Metric>()>;

// Returns the text of the page: the figures of the calls and of the workers, then those of each source.
std::string WriteMetrics(const CallMetrics& calls, const Workers& workers, const std::vector<MetricsSource>& sources);

// The figures of the transport: answers by status, and the memory of these budgets.
using NamedBudgets = std::vector<std::pair<std::string, const Budget&>>;
std::vector<VORN::Metric> HttpMetrics(const AccessLog& log, const NamedBudgets& budgets);

// The uploaded files of the calls that have not ended.
std::vector<VORN::Metric> UploadMetrics(const UploadFolder& uploads);

// The number of sessions that have not ended.
std::vector<VORN::Metric> SessionMetrics(Sessions& sessions);

// The CPU time, memory and descriptors of this process, under the names that all exporters use.
std::vector<VORN::Metric> ProcessMetrics();

}  // namespace vorn::server

#endif  // VORN_SERVER_SERVER_METRICS_H

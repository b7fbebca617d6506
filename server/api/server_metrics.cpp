#include "server_metrics.h"

#include <prometheus/text_serializer.h>
#include <sys/resource.h>
#include <unistd.h>

#include <exception>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <utility>

#include "http.h"

namespace vorn::server {
namespace {

using Kind = VORN::Metric::Kind;

// Upper bounds in seconds: from a reading call to a start of the service and to the deadline of a call.
const prometheus::Histogram::BucketBoundaries kBuckets = {0.0005, 0.002, 0.01, 0.05, 0.2, 1, 5, 20, 60};

prometheus::Labels LabelsOf(const Route& route) {
  return {{"api", route.row.api}, {"version", std::to_string(route.row.version)}, {"method", route.row.method}};
}

prometheus::ClientMetric Sample(const VORN::Metric& metric) {
  prometheus::ClientMetric sample;
  for (const auto& [name, value] : metric.labels) sample.label.push_back({name, value});
  (metric.kind == Kind::kGauge ? sample.gauge.value : sample.counter.value) = metric.value;
  return sample;
}

prometheus::MetricFamily FamilyOf(const VORN::Metric& metric) {
  prometheus::MetricFamily family;
  family.name = metric.name;
  family.help = metric.help;
  family.type = metric.kind == Kind::kGauge ? prometheus::MetricType::Gauge : prometheus::MetricType::Counter;
  return family;
}

void Append(const std::vector<VORN::Metric>& metrics, std::vector<prometheus::MetricFamily>* families) {
  for (const VORN::Metric& metric : metrics) {
    if (families->empty() || families->back().name != metric.name) families->push_back(FamilyOf(metric));
    families->back().metric.push_back(Sample(metric));
  }
}

double SecondsOf(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

double CountOpenDescriptors() {
  std::error_code failure;
  const std::filesystem::directory_iterator descriptors("/proc/self/fd", failure);
  return failure ? 0 : static_cast<double>(std::distance(begin(descriptors), end(descriptors)));
}

// The resident memory in bytes (proc_pid_statm(5)).
double ResidentBytes() {
  std::ifstream statm("/proc/self/statm");
  double total = 0;
  double resident = 0;
  statm >> total >> resident;
  return resident * static_cast<double>(sysconf(_SC_PAGESIZE));
}

// The calls that wait for a thread, and those that run.
std::vector<VORN::Metric> QueueMetrics(const Workers& workers) {
  const WorkerPool::Load reading = workers.reading.load();
  const WorkerPool::Load changing = workers.changing.load();
  constexpr char kWaiting[] = "Calls that wait for a thread";
  constexpr char kRunning[] = "Calls that run";
  const auto gauge = [](const char* name, const char* help, const char* kind, std::size_t value) {
    return VORN::Metric{name, help, Kind::kGauge, {{"kind", kind}}, static_cast<double>(value)};
  };
  return {gauge("vorn_calls_waiting", kWaiting, "reading", reading.waiting),
          gauge("vorn_calls_waiting", kWaiting, "changing", changing.waiting),
          gauge("vorn_calls_running", kRunning, "reading", reading.running),
          gauge("vorn_calls_running", kRunning, "changing", changing.running)};
}

}  // namespace

CallMetrics::CallMetrics()
    : answers_(prometheus::BuildCounter()
                   .Name("vorn_calls_total")
                   .Help("Answered calls by method and error code; 0 is success")
                   .Register(registry_)),
      durations_(prometheus::BuildHistogram()
                     .Name("vorn_call_duration_seconds")
                     .Help("Time that a call has taken on its worker thread")
                     .Register(registry_)) {}

CallMetrics::Figures& CallMetrics::FiguresOf(const Route& route) {
  Figures& figures = figures_[&route];
  if (figures.durations == nullptr) figures.durations = &durations_.Add(LabelsOf(route), kBuckets);
  return figures;
}

prometheus::Counter& CallMetrics::Answers(const Route& route, int code) {
  const std::lock_guard<std::mutex> lock(mutex_);
  prometheus::Counter*& counter = FiguresOf(route).answers[code];
  if (counter == nullptr) {
    prometheus::Labels labels = LabelsOf(route);
    labels["code"] = std::to_string(code);
    counter = &answers_.Add(labels);
  }
  return *counter;
}

prometheus::Histogram& CallMetrics::Durations(const Route& route) {
  const std::lock_guard<std::mutex> lock(mutex_);
  return *FiguresOf(route).durations;
}

// A call is answered, too, when there is no memory to count it.
void CallMetrics::CountAnswer(const Route& route, int code) noexcept {
  try {
    Answers(route, code).Increment();
  } catch (const std::exception&) {
  }
}

void CallMetrics::AddDuration(const Route& route, std::chrono::microseconds duration) noexcept {
  try {
    Durations(route).Observe(std::chrono::duration<double>(duration).count());
  } catch (const std::exception&) {
  }
}

std::string WriteMetrics(const CallMetrics& calls, const Workers& workers, const std::vector<MetricsSource>& sources) {
  std::vector<prometheus::MetricFamily> families = calls.Collect();
  Append(QueueMetrics(workers), &families);
  for (const MetricsSource& read : sources) Append(read(), &families);
  std::ostringstream text;
  text.exceptions(std::ios::badbit);  // a stream hides std::bad_alloc otherwise
  prometheus::TextSerializer().Serialize(text, families);
  return text.str();
}

std::vector<VORN::Metric> HttpMetrics(const AccessLog& log, const NamedBudgets& budgets) {
  std::vector<VORN::Metric> metrics;
  for (const auto& [status, count] : log.Statuses()) {
    metrics.push_back({"vorn_http_responses_total",
                       "Answered requests by HTTP status",
                       Kind::kCounter,
                       {{"status", std::to_string(status)}},
                       static_cast<double>(count)});
  }
  for (const auto& [name, budget] : budgets) {
    metrics.push_back({"vorn_budget_bytes",
                       "Memory that requests may have",
                       Kind::kGauge,
                       {{"budget", name}},
                       static_cast<double>(budget.total())});
  }
  for (const auto& [name, budget] : budgets) {
    metrics.push_back({"vorn_budget_used_bytes",
                       "Memory that requests have",
                       Kind::kGauge,
                       {{"budget", name}},
                       static_cast<double>(budget.used())});
  }
  return metrics;
}

std::vector<VORN::Metric> UploadMetrics(const UploadFolder& uploads) {
  const UploadFolder::Contents contents = uploads.Count();
  return {
      {"vorn_uploads", "Uploaded files of calls that run", Kind::kGauge, {}, static_cast<double>(contents.files)},
      {"vorn_upload_bytes", "Bytes of these uploaded files", Kind::kGauge, {}, static_cast<double>(contents.bytes)}};
}

std::vector<VORN::Metric> SessionMetrics(Sessions& sessions) {
  return {{"vorn_sessions",
           "Sessions that have not ended",
           Kind::kGauge,
           {},
           static_cast<double>(sessions.List(Sessions::Clock::now()).size())}};
}

std::vector<VORN::Metric> ProcessMetrics() {
  rusage used{};
  getrusage(RUSAGE_SELF, &used);
  return {{"process_cpu_seconds_total",
           "User and system CPU time of vornd",
           Kind::kCounter,
           {},
           SecondsOf(used.ru_utime) + SecondsOf(used.ru_stime)},
          {"process_resident_memory_bytes", "Resident memory of vornd", Kind::kGauge, {}, ResidentBytes()},
          {"process_open_fds", "Open descriptors of vornd", Kind::kGauge, {}, CountOpenDescriptors()},
          {"process_max_fds",
           "Descriptors that vornd may have open",
           Kind::kGauge,
           {},
           static_cast<double>(DescriptorLimit())}};
}

}  // namespace vorn::server

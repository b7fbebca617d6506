// The figures of the file service, for monitoring. Our own addition to the contract; no module uses it.
#ifndef VORN_PLATFORM_METRICS_H
#define VORN_PLATFORM_METRICS_H

#include <string>
#include <utility>
#include <vector>

namespace VORN {

// One figure. The names follow https://prometheus.io/docs/practices/naming/: base units, and "_total" for a counter.
struct Metric {
  enum class Kind {
    kGauge,   // a value that rises and falls
    kCounter  // a count since the start of the service; it never falls while the service runs
  };
  std::string name;  // "vorn_nfs_threads"
  std::string help;  // a sentence without a full stop
  Kind kind = Kind::kGauge;
  std::vector<std::pair<std::string, std::string>> labels;
  double value = 0;
};

// Returns the present figures; those of one name are adjacent. A figure that cannot be read is left out. Takes no lock
// and changes nothing. Thread-safe.
std::vector<Metric> ReadMetrics();

}  // namespace VORN

#endif  // VORN_PLATFORM_METRICS_H

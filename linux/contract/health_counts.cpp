#include "health_counts.h"

namespace vorn {
namespace {

const char* NameOf(VORN::HealthFinding::Severity severity) {
  if (severity == VORN::HealthFinding::Severity::kError) return "error";
  return severity == VORN::HealthFinding::Severity::kWarning ? "warning" : "notice";
}

HealthCounts Count(const VORN::HealthReport& report) {
  HealthCounts counts;
  for (const VORN::HealthFinding& finding : report.findings) {
    ++counts.findings[{finding.kind, NameOf(finding.severity)}];
  }
  for (const VORN::HealthGap& gap : report.not_checked) ++counts.not_checked[gap.kind];
  return counts;
}

}  // namespace

std::optional<HealthCounts> RecentHealth::Get() {
  const std::unique_lock checking(checking_, std::try_to_lock);
  {
    const std::lock_guard lock(mutex_);
    const bool is_recent = counts_ && Clock::now() - checked_ < age_;
    if (is_recent || !checking.owns_lock()) return counts_;
  }
  HealthCounts counts = Count(check_());
  const std::lock_guard lock(mutex_);
  counts_ = std::move(counts);
  checked_ = Clock::now();
  return counts_;
}

}  // namespace vorn

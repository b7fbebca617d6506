// The findings of one check.
#ifndef VORN_LINUX_HEALTH_FINDINGS_H
#define VORN_LINUX_HEALTH_FINDINGS_H

#include <string>
#include <utility>
#include <vector>

#include "health.h"

namespace vorn {

// Collects the findings of one kind.
class Findings {
 public:
  explicit Findings(std::string kind) : kind_(std::move(kind)) {}

  // Adds a finding. `text` says what it means for clients, `remedy` what to do. Returns the finding, to which a caller
  // may add a call; it is valid until the next one is added.
  VORN::HealthFinding& Error(VORN::HealthSubject subject, std::string text, std::string remedy);
  VORN::HealthFinding& Warning(VORN::HealthSubject subject, std::string text, std::string remedy);
  VORN::HealthFinding& Notice(VORN::HealthSubject subject, std::string text, std::string remedy);

  std::vector<VORN::HealthFinding> Take() { return std::move(list_); }

 private:
  VORN::HealthFinding& Add(VORN::HealthFinding::Severity severity, VORN::HealthSubject subject, std::string text,
                           std::string remedy);

  std::string kind_;
  std::vector<VORN::HealthFinding> list_;
};

}  // namespace vorn

#endif  // VORN_LINUX_HEALTH_FINDINGS_H

#include "findings.h"

namespace vorn {

using Severity = VORN::HealthFinding::Severity;

VORN::HealthFinding& Findings::Error(VORN::HealthSubject subject, std::string text, std::string remedy) {
  return Add(Severity::kError, std::move(subject), std::move(text), std::move(remedy));
}

VORN::HealthFinding& Findings::Warning(VORN::HealthSubject subject, std::string text, std::string remedy) {
  return Add(Severity::kWarning, std::move(subject), std::move(text), std::move(remedy));
}

VORN::HealthFinding& Findings::Notice(VORN::HealthSubject subject, std::string text, std::string remedy) {
  return Add(Severity::kNotice, std::move(subject), std::move(text), std::move(remedy));
}

VORN::HealthFinding& Findings::Add(Severity severity, VORN::HealthSubject subject, std::string text,
                                   std::string remedy) {
  list_.push_back({kind_, severity, std::move(subject), std::move(text), std::move(remedy), {}});
  return list_.back();
}

}  // namespace vorn

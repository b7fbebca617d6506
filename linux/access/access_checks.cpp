#include "access_checks.h"

#include <algorithm>

#include "unicode.h"

namespace vorn {

using CheckResult = VORN::AccessCheck::Result;

void AccessChecks::Pass(const char* check, const std::string& text) { Add(check, CheckResult::kPassed, text, ""); }

void AccessChecks::Fail(const char* check, const std::string& text, const std::string& remedy) {
  Add(check, CheckResult::kFailed, text, remedy);
}

void AccessChecks::Doubt(const char* check, const std::string& text) { Add(check, CheckResult::kUnknown, text, ""); }

bool AccessChecks::HasFailed(const char* check) const {
  return std::any_of(checks_.begin(), checks_.end(), [check](const VORN::AccessCheck& one) {
    return one.result == CheckResult::kFailed && (check == nullptr || one.check == check);
  });
}

void AccessChecks::Add(const char* check, CheckResult result, const std::string& text, const std::string& remedy) {
  checks_.push_back({check, result, ToValidUtf8(text), ToValidUtf8(remedy)});
}

}  // namespace vorn

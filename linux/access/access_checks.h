// The conditions of an access, in the order in which they were found.
#ifndef VORN_LINUX_ACCESS_ACCESS_CHECKS_H
#define VORN_LINUX_ACCESS_ACCESS_CHECKS_H

#include <string>
#include <vector>

#include "access.h"

namespace vorn {

// Collects the checks of one answer. The sentences are made valid UTF-8.
class AccessChecks {
 public:
  void Pass(const char* check, const std::string& text);
  void Fail(const char* check, const std::string& text, const std::string& remedy);
  void Doubt(const char* check, const std::string& text);  // the box cannot tell

  // Whether a check failed; with a name only those of this name.
  bool HasFailed(const char* check = nullptr) const;

  const std::vector<VORN::AccessCheck>& list() const { return checks_; }

 private:
  void Add(const char* check, VORN::AccessCheck::Result result, const std::string& text, const std::string& remedy);

  std::vector<VORN::AccessCheck> checks_;
};

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_ACCESS_CHECKS_H

// The explanations of accesses of the fake platform.
#include <string>

#include "access.h"
#include "fake_platform.h"

namespace VORN {

int ExplainAccess(const AccessQuestion& question, AccessAnswer* answer) {
  FakePlatform& platform = FakePlatform::Current();
  std::string arguments = question.share + " " + question.client + " " + question.flavor + " " + question.version +
                          " " + std::to_string(question.port) + " '" + question.user + "'";
  for (const std::string& group : question.groups) arguments += " " + group;
  if (platform.Fails("ExplainAccess", arguments)) return platform.FailureResult("ExplainAccess");
  *answer = platform.access;
  return 0;
}

}  // namespace VORN

#include "program.h"

#include <syslog.h>

#include <string>
#include <string_view>
#include <vector>

#include "core.h"
#include "error.h"
#include "lock.h"
#include "root.h"

namespace vorn {
namespace {

constexpr int kMostLines = 100;

Status Run(const char* program, const std::vector<std::string>& arguments) {
  const Result<std::string> path = Root::Current().Locate(program);
  if (!path.ok()) return path.status();
  const LockPause pause;
  int count = 0;
  Status status = RunProgram(*path, arguments, [&](std::string_view line) {
    if (count++ >= kMostLines) return;
    syslog(LOG_INFO, "%s: %.*s", program, static_cast<int>(line.size()), line.data());
  });
  if (count > kMostLines) syslog(LOG_INFO, "%s: %d more lines", program, count - kMostLines);
  return status;
}

}  // namespace
}  // namespace vorn

int KLIBCExec(const char* program, const char* a1, const char* a2, const char* a3, const char* a4) {
  std::vector<std::string> arguments;
  for (const char* argument : {a1, a2, a3, a4}) {
    if (argument == nullptr) break;
    arguments.emplace_back(argument);
  }
  return vorn::ToResult(vorn::Run(program, arguments));
}

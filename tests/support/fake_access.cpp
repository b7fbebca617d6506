// The explanations of accesses of the fake platform.
#include <string>
#include <vector>

#include "access.h"
#include "fake_platform.h"

namespace {

std::string Arguments(const VORN::AccessQuestion& question) {
  std::string arguments = question.share + " " + question.client + " " + question.flavor + " " + question.version +
                          " " + std::to_string(question.port) + " '" + question.user + "'";
  for (const std::string& group : question.groups) arguments += " " + group;
  return arguments;
}

}  // namespace

namespace VORN {

int ExplainAccess(const AccessQuestion& question, AccessAnswer* answer) {
  FakePlatform& platform = FakePlatform::Current();
  if (platform.Fails("ExplainAccess", Arguments(question))) return platform.FailureResult("ExplainAccess");
  *answer = platform.access;
  return 0;
}

int ExplainAccesses(const AccessQuestion& question, const std::vector<std::string>& shares,
                    std::vector<AccessAnswer>* answers) {
  FakePlatform& platform = FakePlatform::Current();
  std::string arguments = Arguments(question);
  for (const std::string& share : shares) arguments += " /" + share;
  if (platform.Fails("ExplainAccesses", arguments)) return platform.FailureResult("ExplainAccesses");
  answers->assign(shares.size(), platform.access);
  return 0;
}

int ExplainClients(const ClientsQuestion& question, std::vector<ClientAccess>* clients, int* total) {
  FakePlatform& platform = FakePlatform::Current();
  std::string arguments = Arguments(question.access);
  for (const std::string& flavor : question.flavors) arguments += " " + flavor;
  arguments += " from " + std::to_string(question.offset) + " at most " + std::to_string(question.limit);
  if (platform.Fails("ExplainClients", arguments)) return platform.FailureResult("ExplainClients");
  *clients = platform.client_accesses;
  *total = static_cast<int>(clients->size());
  return 0;
}

}  // namespace VORN

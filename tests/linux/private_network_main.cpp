// main() of tests that change the state of the network, or mount file systems. It runs the test program again in
// mount and network namespaces of its own, with a loopback interface and an empty /run.
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

#include "private_namespaces.h"
#include "processes.h"
#include "requirements.h"

namespace {

constexpr char kInside[] = "VORN_TEST_PRIVATE_NETWORK";

int RunInside(char** argv) {
  setenv(kInside, "yes", 1);
  const std::vector<std::string>& command = GetPrivateNamespaces().command;
  std::vector<char*> words;
  for (const std::string& word : command) words.push_back(const_cast<char*>(word.c_str()));
  for (char** word = argv; *word != nullptr; ++word) words.push_back(*word);
  words.push_back(nullptr);
  execvp(words[0], words.data());
  std::perror(words[0]);
  return 1;
}

bool PrepareNamespaces() {
  const ProgramResult result = RunProgram({"sh", "-ec", "ip link set lo up; mount -t tmpfs none /run"});
  if (result.status != 0) std::fprintf(stderr, "cannot prepare the namespaces: %s\n", result.errors.c_str());
  return result.status == 0;
}

}  // namespace

int main(int argc, char** argv) {
  const bool is_inside = std::getenv(kInside) != nullptr;
  const bool can_enter = ProgramMissing("ip").empty() && GetPrivateNamespaces().unavailable.empty();
  if (!is_inside && can_enter) return RunInside(argv);
  if (is_inside && !PrepareNamespaces()) return 1;
  testing::InitGoogleMock(&argc, argv);
  RequirePrograms({"ip", "nft"});
  if (!is_inside) RequirePrivateNamespaces();
  return RUN_ALL_TESTS();
}

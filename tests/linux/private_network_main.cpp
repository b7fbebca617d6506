// main() of tests that change the network's state, or mount: runs them as root of a user, mount and network namespace
// of their own (unshare(1)), with a loopback interface and an empty /run, so that they disturb nobody and need no
// rights.
#include <gmock/gmock.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <vector>

#include "processes.h"

namespace {

constexpr char kInside[] = "VORN_TEST_PRIVATE_NETWORK";

int RunInside(char** argv) {
  setenv(kInside, "yes", 1);
  std::vector<char*> words{const_cast<char*>("unshare"), const_cast<char*>("-Urmn")};
  for (char** word = argv; *word != nullptr; ++word) words.push_back(*word);
  words.push_back(nullptr);
  execvp(words[0], words.data());
  std::perror("unshare");
  return 1;
}

}  // namespace

int main(int argc, char** argv) {
  if (std::getenv(kInside) == nullptr) return RunInside(argv);
  const ProgramResult prepared = RunProgram({"sh", "-ec", "ip link set lo up; mount -t tmpfs none /run"});
  if (prepared.status != 0) {
    std::fprintf(stderr, "no network of our own: %s\n", prepared.errors.c_str());
    return 1;
  }
  testing::InitGoogleMock(&argc, argv);
  return RUN_ALL_TESTS();
}

#include "requirements.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <sstream>
#include <utility>

#include "private_namespaces.h"

namespace {

// Evaluates a requirement once, before the first test.
class Requirement : public testing::Environment {
 public:
  using Check = std::string (*)(const std::string& name);

  Requirement(Check check, std::string name, bool fails_in_ci)
      : check_(check), name_(std::move(name)), fails_in_ci_(fails_in_ci) {}

  void SetUp() override {
    const std::string reason = check_(name_);
    if (reason.empty()) return;
    if (fails_in_ci_ && RunsInCI()) FAIL() << reason;
    GTEST_SKIP() << reason;
  }

 private:
  const Check check_;
  const std::string name_;
  const bool fails_in_ci_;
};

}  // namespace

std::string ProgramMissing(const std::string& name) {
  const char* path = std::getenv("PATH");
  std::istringstream folders((path == nullptr ? "" : std::string(path) + ":") + "/usr/sbin:/sbin");
  for (std::string folder; std::getline(folders, folder, ':');) {
    if (access((folder + "/" + name).c_str(), X_OK) == 0) return "";
  }
  return name + " is not installed";
}

bool RunsInCI() {
  const char* value = std::getenv("CI");
  return value != nullptr && std::string(value) == "true";
}

bool RequirePrograms(std::initializer_list<const char*> names) {
  for (const char* name : names) testing::AddGlobalTestEnvironment(new Requirement(ProgramMissing, name, true));
  return true;
}

bool RequirePrivateNamespaces() {
  const auto check = [](const std::string& /*name*/) { return GetPrivateNamespaces().unavailable; };
  testing::AddGlobalTestEnvironment(new Requirement(check, "", false));
  return true;
}

// The module's binary as a server meets it: what it shows, and that it runs on whichever platform
// is loaded below it.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <cstdio>
#include <memory>
#include <sstream>
#include <string>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::ElementsAreArray;
using testing::IsEmpty;

struct ClosePipe {
  void operator()(FILE* pipe) const { pclose(pipe); }
};

std::string OutputOf(const std::string& command) {
  const std::unique_ptr<FILE, ClosePipe> pipe(popen(command.c_str(), "r"));
  std::string output;
  std::array<char, 4096> buffer{};
  while (fgets(buffer.data(), buffer.size(), pipe.get()) != nullptr) output += buffer.data();
  return output;
}

// The names in nm(1)'s table, without addresses.
std::vector<std::string> SymbolNames(const std::string& options) {
  std::istringstream lines(OutputOf("nm " + options + " --format=posix " MODULE_PATH));
  std::vector<std::string> names;
  for (std::string line; std::getline(lines, line);) names.push_back(line.substr(0, line.find(' ')));
  std::sort(names.begin(), names.end());
  return names;
}

struct Unload {
  void operator()(void* library) const { dlclose(library); }
};

std::unique_ptr<void, Unload> LoadModule() {
  return std::unique_ptr<void, Unload>(dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL));
}

TEST(Binary, ExportsTheTableAndTheEntryFunctionsAndNothingElse) {
  EXPECT_THAT(SymbolNames("--dynamic --defined-only"),
              ElementsAreArray({"GetAPITable", "NFSAdvGet", "NFSAdvSet", "NFSGet", "NFSGetV2", "NFSIDMapCreate",
                                "NFSIDMapDelete", "NFSIDMapList", "NFSIDMapSet", "NFSKerberosGet", "NFSKerberosList",
                                "NFSKerberosUploadKey", "NFSSet", "NFSSetV2", "NFSSharePrivilegeGet",
                                "NFSSharePrivilegeSet", "gTable"}));
}

TEST(Binary, RunsNothingWhenItIsLoaded) {
  const std::vector<std::string> names = SymbolNames("");
  ASSERT_THAT(names, testing::Contains("gTable")) << "the symbol table must be there to be looked at";
  std::vector<std::string> constructors;
  std::copy_if(names.begin(), names.end(), std::back_inserter(constructors),
               [](const std::string& name) { return name.rfind("_GLOBAL__sub_I", 0) == 0; });
  EXPECT_THAT(constructors, IsEmpty());
}

TEST(Binary, IsBoundToThePlatformThatIsThere) {
  FakePlatform platform;
  const auto module = LoadModule();
  ASSERT_NE(module, nullptr) << dlerror();
  const auto get_table = reinterpret_cast<GetAPITableFunction>(dlsym(module.get(), "GetAPITable"));
  ASSERT_NE(get_table, nullptr);
  const auto* const row = static_cast<const APIRow*>(get_table());
  EXPECT_EQ(dlsym(module.get(), "gTable"), get_table());

  platform.domain = "lab.example";
  const Answer answer = Call(row->handler, "{}");
  EXPECT_EQ(answer.code, 0);
  EXPECT_EQ(answer.data["nfs_v4_domain"], "lab.example");
}

}  // namespace

// The module's binary as a server meets it: what it shows, and that it runs on whichever platform
// is loaded below it.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::ElementsAreArray;
using testing::IsEmpty;

// The names in a list that nm(1) wrote when the module was built, without addresses. Not asked for here: where the
// tests run under an emulator, no program can be started.
std::vector<std::string> SymbolNames(const char* list) {
  std::ifstream lines(list);
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
  EXPECT_THAT(SymbolNames(VISIBLE_SYMBOLS),
              ElementsAreArray({"GetAPITable", "NFSAdvGet", "NFSAdvSet", "NFSGet", "NFSGetV2", "NFSIDMapCreate",
                                "NFSIDMapDelete", "NFSIDMapList", "NFSIDMapSet", "NFSKerberosGet", "NFSKerberosList",
                                "NFSKerberosUploadKey", "NFSSet", "NFSSetV2", "NFSSharePrivilegeGet",
                                "NFSSharePrivilegeSet", "gTable"}));
}

TEST(Binary, RunsNothingWhenItIsLoaded) {
  const std::vector<std::string> names = SymbolNames(ALL_SYMBOLS);
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

// The module's binary as a server loads it: its exported symbols, no code at load time, and symbols of the platform
// that are resolved at load time.
#include <dlfcn.h>
#include <gmock/gmock.h>

#include <algorithm>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "fake_platform.h"

namespace {

using testing::IsEmpty;
using testing::UnorderedElementsAreArray;

// Reads the symbol names from a list that nm(1) wrote when the module was built. The test does not run nm itself,
// because a test under an emulator cannot start programs of the host.
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

// The mangled name of the entry function `name` (Itanium C++ ABI): void name(VORN::APIRequest*, VORN::APIResponse*).
std::string EntrySymbol(const std::string& name) {
  return "_Z" + std::to_string(name.size()) + name + "PN4VORN10APIRequestEPNS_11APIResponseE";
}

TEST(Binary, ExportsTheTableAndTheEntryFunctionsAndNothingElse) {
  std::vector<std::string> symbols{"GetAPITable", "gTable"};
  for (const char* entry : {"NFSGet", "NFSSet", "NFSGetV2", "NFSSetV2", "NFSAdvGet", "NFSAdvSet", "NFSKerberosGet",
                            "NFSKerberosUploadKey", "NFSKerberosList", "NFSIDMapList", "NFSIDMapCreate", "NFSIDMapSet",
                            "NFSIDMapDelete", "NFSSharePrivilegeGet", "NFSSharePrivilegeSet"}) {
    symbols.push_back(EntrySymbol(entry));
  }
  EXPECT_THAT(SymbolNames(VISIBLE_SYMBOLS), UnorderedElementsAreArray(symbols));
}

TEST(Binary, RunsNothingWhenItIsLoaded) {
  const std::vector<std::string> names = SymbolNames(ALL_SYMBOLS);
  ASSERT_THAT(names, testing::Contains("gTable")) << "the symbol table must be there to be looked at";
  std::vector<std::string> constructors;
  std::copy_if(names.begin(), names.end(), std::back_inserter(constructors),
               [](const std::string& name) { return name.rfind("_GLOBAL__sub_I", 0) == 0; });
  EXPECT_THAT(constructors, IsEmpty());
}

TEST(Binary, UsesThePlatformThatIsLoaded) {
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

#include "module.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "sandbox.h"

namespace vorn::server {
namespace {

using testing::IsEmpty;
using testing::SizeIs;

void Copy(const std::string& from, const std::string& to) { std::filesystem::copy_file(from, to); }

TEST(Modules, AreLoadedWithTheirRowsAndDescriptors) {
  const std::vector<Module> modules = LoadModules(TEST_MODULES);
  ASSERT_THAT(modules, SizeIs(1));
  EXPECT_THAT(modules[0].rows, SizeIs(14));
  EXPECT_STREQ(modules[0].rows[0].api, "Test.Echo");
  EXPECT_STREQ(modules[0].rows[9].method, "get");
  EXPECT_EQ(modules[0].rows[9].version, 2);
  EXPECT_EQ(modules[0].descriptor.Describe(2351).status, 409);
}

TEST(Modules, AreLoadedWithoutTheBrokenOnes) {
  const Sandbox sandbox;
  sandbox.Write("broken.so", "this is no library");
  sandbox.Write("readme.txt", "this is no module");
  for (const char* name : {"no_table", "null_table", "empty_table", "no_handler"}) {
    Copy(std::string(ODD_MODULES) + "/" + name + ".so", sandbox.File(std::string(name) + ".so"));
  }
  EXPECT_THAT(LoadModules(sandbox.path()), IsEmpty());
  Copy(std::string(TEST_MODULES) + "/echo.so", sandbox.File("echo.so"));
  EXPECT_THAT(LoadModules(sandbox.path()), SizeIs(1));
}

TEST(Modules, WorkWithoutADescriptorOrWithAFaultyOne) {
  const Sandbox sandbox;
  Copy(std::string(TEST_MODULES) + "/echo.so", sandbox.File("echo.so"));
  ASSERT_THAT(LoadModules(sandbox.path()), SizeIs(1));
  sandbox.Write("echo.json", "{ not json");
  const std::vector<Module> modules = LoadModules(sandbox.path());
  ASSERT_THAT(modules, SizeIs(1));
  EXPECT_EQ(modules[0].descriptor.Describe(2351).status, 500);
}

TEST(Modules, AreNoneIfTheFolderIsMissing) { EXPECT_THAT(LoadModules("/nonexistent"), IsEmpty()); }

}  // namespace
}  // namespace vorn::server

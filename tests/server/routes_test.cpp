#include "routes.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

void First(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}
void Second(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}

std::vector<Module> TwoModules() {
  return {{"a.so", {{"Nfs", 1, "get", First}, {"Nfs", 1, "set", First}, {"Nfs", 2, "get", First}}, {}},
          {"b.so", {{"Nfs", 1, "get", Second}, {"Nfs.IDMap", 1, "list", Second}}, {}}};
}

TEST(Routes, LeadToRows) {
  const std::vector<Module> modules = TwoModules();
  const Routes routes(modules);
  std::string unknown;
  const Route* route = routes.Find("/api/Nfs/v2/get", &unknown);
  ASSERT_NE(route, nullptr) << unknown;
  EXPECT_EQ(route->Name(), "Nfs v2 get");
  EXPECT_EQ(route->descriptor, &modules[0].descriptor);
  EXPECT_NE(routes.Find("/api/Nfs.IDMap/v1/list", &unknown), nullptr) << unknown;
}

TEST(Routes, KnowWhatTheDescriptorTellsOfAMethod) {
  std::string error;
  std::vector<Module> modules = TwoModules();
  modules[0].descriptor =
      *Descriptor::Parse(R"({"paths": {"/api/Nfs/v1/get": {"post": {"x-read-only": true}}}})", &error);
  const Routes routes(modules);
  EXPECT_EQ(routes.Find("/api/Nfs/v1/get", &error)->Id(), "Nfs/v1/get");
  EXPECT_TRUE(routes.Find("/api/Nfs/v1/get", &error)->method.reads_only);
  EXPECT_FALSE(routes.Find("/api/Nfs/v1/set", &error)->method.reads_only);
}

TEST(Routes, PairAChangeWithTheMethodThatShowsIt) {
  std::string error;
  std::vector<Module> modules = TwoModules();
  modules[0].descriptor = *Descriptor::Parse(R"({"paths": {
      "/api/Nfs/v1/get": {"post": {"x-read-only": true}},
      "/api/Nfs/v1/set": {"post": {"x-shown-by": {"method": "Nfs/v1/get"}}},
      "/api/Nfs/v2/get": {"post": {"x-shown-by": {"method": "Nfs/v1/set"}}}}})",
                                             &error);
  const Routes routes(modules);
  const Route* reader = routes.Find("/api/Nfs/v1/get", &error);
  EXPECT_EQ(routes.Find("/api/Nfs/v1/set", &error)->shown_by, reader);
  EXPECT_EQ(reader->shown_by, nullptr);
  EXPECT_EQ(routes.Find("/api/Nfs/v2/get", &error)->shown_by, nullptr) << "a method that may change something";
}

TEST(Routes, OfTwoRowsWithOneNameTheFirstCounts) {
  const std::vector<Module> modules = TwoModules();
  std::string unknown;
  EXPECT_EQ(Routes(modules).Find("/api/Nfs/v1/get", &unknown)->row.handler, First);
}

TEST(Routes, SayWhatIsUnknown) {
  const std::vector<Module> modules = TwoModules();
  const Routes routes(modules);
  const struct {
    const char* path;
    const char* unknown;
  } cases[] = {
      {"/api/Smb/v1/get", "There is no API \"Smb\"."},
      {"/api//v1/get", "There is no API \"\"."},
      {"/api/Nfs/v3/get", "The API \"Nfs\" has no version \"v3\"."},
      {"/api/Nfs/1/get", "The API \"Nfs\" has no version \"1\"."},
      {"/api/Nfs/v01/get", "The API \"Nfs\" has no version \"v01\"."},
      {"/api/Nfs/v1x/get", "The API \"Nfs\" has no version \"v1x\"."},
      {"/api/Nfs/v99999999999/get", "The API \"Nfs\" has no version \"v99999999999\"."},
      {"/api/Nfs/v/get", "The API \"Nfs\" has no version \"v\"."},
      {"/api/Nfs/v1/del", "Version 1 of the API \"Nfs\" has no method \"del\"."},
      {"/api/Nfs/v1/get/", "Version 1 of the API \"Nfs\" has no method \"get/\"."},
      {"/api/Nfs/v1/get?x=1", "Version 1 of the API \"Nfs\" has no method \"get?x=1\"."},
      {"/api/Nfs/v1", "There is nothing at \"/api/Nfs/v1\"."},
      {"/api/", "There is nothing at \"/api/\"."},
      {"/", "There is nothing at \"/\"."},
      {"", "There is nothing at \"\"."},
      {"*", "There is nothing at \"*\"."},
  };
  for (const auto& c : cases) {
    std::string unknown;
    EXPECT_EQ(routes.Find(c.path, &unknown), nullptr) << c.path;
    EXPECT_EQ(unknown, c.unknown);
  }
}

TEST(Routes, ListEveryRowOnce) {
  const std::vector<Module> modules = TwoModules();
  const Json::Value list = Routes(modules).List();
  ASSERT_EQ(list.size(), 4U);
  EXPECT_EQ(list[2]["api"], "Nfs");
  EXPECT_EQ(list[2]["version"], 2);
  EXPECT_EQ(list[2]["method"], "get");
}

}  // namespace
}  // namespace vorn::server

// Compares the parameters that the module reads with those that its descriptor describes. The requests are the examples
// of the descriptor; each parameter that the module looks up in a request object is recorded.
#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <set>
#include <string>
#include <string_view>

#include "api_table.h"
#include "fake_platform.h"
#include "furnished_box.h"

namespace {

using testing::ContainerEq;

std::set<std::string> looked_up;

Json::Value Descriptor() {
  std::ifstream file(NFS_DESCRIPTOR);
  return Parse({std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()});
}

std::string PathOf(const APIRow& row) {
  return std::string("/api/") + row.api + "/v" + std::to_string(row.version) + "/" + row.method;
}

// Adds the names of all properties of a schema, also those of its items and properties.
void AddNames(const Json::Value& descriptor, const Json::Value& schema, std::set<std::string>* names) {
  if (schema.isMember("$ref")) {
    const std::string reference = schema["$ref"].asString();
    AddNames(descriptor, descriptor["components"]["schemas"][reference.substr(reference.rfind('/') + 1)], names);
  }
  if (schema.isMember("items")) AddNames(descriptor, schema["items"], names);
  for (const std::string& name : schema["properties"].getMemberNames()) {
    names->insert(name);
    AddNames(descriptor, schema["properties"][name], names);
  }
}

// The only content of the request body.
const Json::Value& Content(const Json::Value& operation) { return *operation["requestBody"]["content"].begin(); }

bool TakesFile(const Json::Value& operation) {
  return operation["requestBody"]["content"].isMember("multipart/form-data");
}

// Returns the parameters that the module gets. The server appends "_tmp" to the name of a file.
std::set<std::string> DescribedParameters(const Json::Value& descriptor, const Json::Value& operation) {
  std::set<std::string> names;
  AddNames(descriptor, Content(operation)["schema"], &names);
  if (!TakesFile(operation)) return names;
  std::set<std::string> paths;
  for (const std::string& name : names) paths.insert(name + "_tmp");
  return paths;
}

std::string RequestOf(const Json::Value& operation, const Json::Value& example) {
  if (!TakesFile(operation)) return example["value"].toStyledString();
  Json::Value request;
  for (const std::string& name : example["value"].getMemberNames()) request[name + "_tmp"] = "/nonexistent/upload";
  return request.toStyledString();
}

TEST(Contract, DescribesEveryMethodOfTheTable) {
  std::set<std::string> paths;
  for (const APIRow* row = gTable; row->api != nullptr; ++row) paths.insert(PathOf(*row));
  const Json::Value descriptor = Descriptor();
  const std::vector<std::string> described = descriptor["paths"].getMemberNames();
  EXPECT_THAT(std::set<std::string>(described.begin(), described.end()), ContainerEq(paths));
}

TEST(Contract, DescribesExactlyTheParametersThatTheModuleReads) {
  const Json::Value descriptor = Descriptor();
  FakePlatform platform;
  Furnish(&platform);
  platform.shares["media"] = "/volume1/media";
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    const Json::Value& operation = descriptor["paths"][PathOf(*row)]["post"];
    const Json::Value& examples = Content(operation)["examples"];
    EXPECT_FALSE(examples.empty()) << PathOf(*row);
    std::set<std::string> read;
    for (const Json::Value& example : examples) {
      const std::string request = RequestOf(operation, example);
      looked_up.clear();
      EXPECT_EQ(Call(row->handler, request).code, 0) << PathOf(*row);
      read.merge(looked_up);
    }
    EXPECT_THAT(read, ContainerEq(DescribedParameters(descriptor, operation))) << PathOf(*row);
  }
}

}  // namespace

// ld(1), "--wrap": replaces the functions by which the module looks parameters up: FindMembers and
// Json::Value::operator[](const char*) const.
extern "C" const Json::Value& __real__ZNK4Json5ValueixEPKc(const Json::Value* object, const char* key);
extern "C" const Json::Value& __wrap__ZNK4Json5ValueixEPKc(const Json::Value* object, const char* key) {
  looked_up.insert(key);
  return __real__ZNK4Json5ValueixEPKc(object, key);
}

extern "C" void __real__Z11FindMembersRKN4Json5ValueEPKSt17basic_string_viewIcSt11char_traitsIcEES8_PPS1_(
    const Json::Value& object, const std::string_view* first, const std::string_view* last,
    const Json::Value** members);
extern "C" void __wrap__Z11FindMembersRKN4Json5ValueEPKSt17basic_string_viewIcSt11char_traitsIcEES8_PPS1_(
    const Json::Value& object, const std::string_view* first, const std::string_view* last,
    const Json::Value** members) {
  for (const std::string_view* name = first; name != last; ++name) looked_up.emplace(*name);
  __real__Z11FindMembersRKN4Json5ValueEPKSt17basic_string_viewIcSt11char_traitsIcEES8_PPS1_(object, first, last,
                                                                                            members);
}

#include "descriptor.h"

#include <gtest/gtest.h>

#include "sandbox.h"

namespace vorn::server {
namespace {

TEST(Descriptor, GivesStatusAndTextOfACode) {
  std::string error;
  const auto descriptor = Descriptor::Parse(
      R"({"openapi": "3.1.0", "x-error-codes": {"2301": {"status": 400, "text": "Wrong."}}})", &error);
  ASSERT_TRUE(descriptor) << error;
  EXPECT_EQ(descriptor->Describe(2301).status, 400);
  EXPECT_EQ(descriptor->Describe(2301).text, "Wrong.");
}

TEST(Descriptor, HasAPlainTextForCodesItDoesNotKnow) {
  EXPECT_EQ(Descriptor().Describe(2399).status, 500);
  EXPECT_EQ(Descriptor().Describe(2399).text, "The operation failed with error code 2399.");
}

TEST(Descriptor, NeedsNoCodes) {
  std::string error;
  EXPECT_TRUE(Descriptor::Parse("{}", &error)) << error;
}

TEST(Descriptor, IsRefusedWhenFaulty) {
  for (const char* json :
       {"",
        "[]",
        "{",
        R"({"x-error-codes": []})",
        R"({"x-error-codes": {"a": {"status": 400, "text": "x"}}})",
        R"({"x-error-codes": {"1x": {"status": 400, "text": "x"}}})",
        R"({"x-error-codes": {"0": {"status": 400, "text": "x"}}})",
        R"({"x-error-codes": {"1": 400}})",
        R"({"x-error-codes": {"1": {"text": "x"}}})",
        R"({"x-error-codes": {"1": {"status": 200, "text": "x"}}})",
        R"({"x-error-codes": {"1": {"status": 600, "text": "x"}}})",
        R"({"x-error-codes": {"1": {"status": 400, "text": 1}}})",
        R"({"paths": []})",
        R"({"paths": {"/a": 1}})",
        R"({"paths": {"/a": {"get": {}}}})",
        R"({"paths": {"/a": {"post": {"x-read-only": "true"}}}})",
        R"({"paths": {"/a": {"post": {"x-share-parameter": 1}}}})",
        R"({"paths": {"/a": {"post": {"x-share-parameter": ""}}}})",
        R"({"paths": {"/a": {"post": {"x-shown-by": "A/v1/get"}}}})",
        R"({"paths": {"/a": {"post": {"x-shown-by": {}}}}})",
        R"({"paths": {"/a": {"post": {"x-shown-by": {"method": "A/v1/get", "same": "name"}}}}})",
        R"({"paths": {"/a": {"post": {"x-shown-by": {"method": "A/v1/get", "same": [1]}}}}})",
        R"({"components": {"schemas": []}})",
        R"({"components": {"schemas": {"A": {"maxLength": 1}}}})",
        R"({"x-error-codes": {"1": {"status": 400, "text": "x", "parameters": "yes"}}})",
        R"({"paths": {"/a": {"post": {"requestBody": {"content": []}}}}})",
        R"({"paths": {"/a": {"post": {"requestBody": {"content": {"x": {"schema": {"maxLength": 1}}}}}}}})",
        R"({"paths": {"/a": {"post": {"responses": {"200": {"content": {"x": {"schema": {"maxLength": 1}}}}}}}}})",
        R"({"paths": {"/a": {"post": {"x-error-codes": []}}}})",
        R"({"paths": {"/a": {"post": {"x-error-codes": {"1": {"when": "x"}}}}}})",
        R"({"x-error-codes": {"1": {"status": 400, "text": "x"}},
            "paths": {"/a": {"post": {"x-error-codes": {"1": {}}}}}})",
        R"({"x-error-codes": {"1": {"status": 400, "text": "x"}},
            "paths": {"/a": {"post": {"x-error-codes": {"1": {"when": "x", "details": {"maxLength": 1}}}}}}})"}) {
    std::string error;
    EXPECT_FALSE(Descriptor::Parse(json, &error)) << json;
    EXPECT_NE(error, "") << json;
  }
}

TEST(Descriptor, TellsWhatAMethodDoes) {
  std::string error;
  const auto descriptor = Descriptor::Parse(R"({"paths": {
      "/api/A/v1/get": {"post": {"x-read-only": true}},
      "/api/A/v1/set": {"post": {"x-read-only": false, "x-shown-by": {"method": "A/v1/get", "same": ["name"]}, "requestBody": {"content": {"application/json": {}}}}},
      "/api/A/v1/put": {"post": {"requestBody": {"content": {"multipart/form-data": {}}}}}}})",
                                            &error);
  ASSERT_TRUE(descriptor) << error;
  EXPECT_TRUE(descriptor->MethodAt("/api/A/v1/get").reads_only);
  EXPECT_FALSE(descriptor->MethodAt("/api/A/v1/set").reads_only);
  EXPECT_FALSE(descriptor->MethodAt("/api/A/v1/set").takes_file);
  EXPECT_EQ(descriptor->MethodAt("/api/A/v1/set").shown_by, "A/v1/get");
  EXPECT_EQ(descriptor->MethodAt("/api/A/v1/set").same, std::vector<std::string>{"name"});
  EXPECT_TRUE(descriptor->MethodAt("/api/A/v1/put").takes_file);
  EXPECT_FALSE(descriptor->MethodAt("/api/A/v1/unknown").reads_only) << "an undescribed method may write";
}

TEST(Descriptor, TellsWhichParametersAreFaulty) {
  std::string error;
  const auto descriptor = Descriptor::Parse(R"({"paths": {"/a": {"post": {"requestBody": {"content": {
      "application/json": {"schema": {"required": ["size"]}}}}}}, "/b": {"post": {}}}})",
                                            &error);
  ASSERT_TRUE(descriptor) << error;
  const Json::Value none(Json::objectValue);
  EXPECT_EQ(descriptor->ParameterFaults("/a", none), std::vector<std::string>{"\"size\" is missing."});
  EXPECT_TRUE(descriptor->ParameterFaults("/b", none).empty());
  EXPECT_TRUE(descriptor->ParameterFaults("/c", none).empty());
}

TEST(Descriptor, OfTheNfsModuleDescribesItsMethods) {
  std::string error;
  const auto descriptor = Descriptor::Parse(ReadWholeFile(NFS_DESCRIPTOR), &error);
  ASSERT_TRUE(descriptor) << error;
  const std::string nfs = "/api/VORN.Core.FileServ.NFS";
  for (const char* reading : {"/v1/get", "/v2/get", ".AdvancedSetting/v1/get", ".Kerberos/v1/get", ".Kerberos/v1/list",
                              ".IDMap/v1/list", ".SharePrivilege/v1/load"}) {
    EXPECT_TRUE(descriptor->MethodAt(nfs + reading).reads_only) << reading;
  }
  EXPECT_EQ(descriptor->Paths().size(), 15U);
  for (const std::string& path : descriptor->Paths()) {
    const bool writes = path.find("/set") != std::string::npos || path.find("/save") != std::string::npos ||
                        path.find("/create") != std::string::npos || path.find("/delete") != std::string::npos ||
                        path.find("/upload_key") != std::string::npos;
    EXPECT_NE(descriptor->MethodAt(path).reads_only, writes) << path;
    EXPECT_EQ(descriptor->MethodAt(path).takes_file, path == nfs + ".Kerberos/v1/upload_key") << path;
  }
}

TEST(Descriptor, OfTheNfsModuleCoversItsCodes) {
  std::string error;
  const auto descriptor = Descriptor::Parse(ReadWholeFile(NFS_DESCRIPTOR), &error);
  ASSERT_TRUE(descriptor) << error;
  for (const int code : {2301, 2302, 2303, 2330, 2331, 2332, 2351, 2352, 2353, 2370, 2371}) {
    EXPECT_EQ(descriptor->Describe(code).text.find("error code"), std::string::npos) << code;
  }
  EXPECT_EQ(descriptor->Describe(2301).status, 400);
  EXPECT_TRUE(descriptor->Describe(2301).about_parameters);
  EXPECT_EQ(descriptor->Describe(2302).status, 500);
  EXPECT_FALSE(descriptor->Describe(2302).about_parameters);
}

}  // namespace
}  // namespace vorn::server

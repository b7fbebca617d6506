// The module of the server's tests. Its methods echo, fail, wait, throw or upload as the tests request.
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <cstring>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <thread>

#include "call.h"
#include "webapi.h"

namespace {

Json::Value Parameters(const VORN::APIRequest& request) { return request.GetParam("", Json::Value()); }

void Echo(VORN::APIRequest* request, VORN::APIResponse* response) { response->SetSuccess(Parameters(*request)); }

void EchoV2(VORN::APIRequest* request, VORN::APIResponse* response) {
  response->SetSuccess(request->GetParam("value", "none"));
}

// Fails with the requested code and details.
void Fail(VORN::APIRequest* request, VORN::APIResponse* response) {
  response->SetError(request->GetParam("code", 1).asInt(), request->GetParam("details", Json::Value()));
}

void Throw(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {
  throw std::runtime_error("thrown on purpose");
}

void ThrowNumber(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) { throw 7; }

void Silent(VORN::APIRequest* /*request*/, VORN::APIResponse* /*response*/) {}

// Creates the file "begun", and answers once the test has created the file "release".
void Wait(VORN::APIRequest* request, VORN::APIResponse* response) {
  const std::string begun = request->GetParam("begun", "").asString();
  const std::string release = request->GetParam("release", "").asString();
  std::ofstream(begun) << "begun";
  while (access(release.c_str(), F_OK) != 0) std::this_thread::sleep_for(std::chrono::milliseconds(5));
  response->SetSuccess("released");
}

// Answers with the root that the server was started with.
void Root(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  const char* root = std::getenv("VORN_ROOT");
  response->SetSuccess(root == nullptr ? Json::Value() : Json::Value(root));
}

// Answers the size, mode, first byte and path of the uploaded file. "remove" removes the file.
void Upload(VORN::APIRequest* request, VORN::APIResponse* response) {
  const std::string path = request->GetParam("keytab_file_tmp", "").asString();
  struct stat there {};
  Json::Value result = Parameters(*request);
  result["size"] = stat(path.c_str(), &there) == 0 ? Json::Int64(there.st_size) : Json::Int64(-1);
  result["mode"] = there.st_mode & 0777;
  result["first"] = std::ifstream(path).get();
  if (request->GetParam("remove", "").asString() == "yes") unlink(path.c_str());
  response->SetSuccess(result);
}

// Answers a string that is not UTF-8.
void Binary(VORN::APIRequest* /*request*/, VORN::APIResponse* response) { response->SetSuccess("\xff\xfe"); }

// Adds the sentences of "reasons" and "warnings" to the call context, then fails with "code" unless it is 0.
void Remark(VORN::APIRequest* request, VORN::APIResponse* response) {
  VORN::CallContext* context = VORN::CallContext::Current();
  for (const auto& reason : request->GetParam("reasons", Json::arrayValue)) context->AddReason(reason.asString());
  for (const auto& warning : request->GetParam("warnings", Json::arrayValue)) context->AddWarning(warning.asString());
  const int code = request->GetParam("code", 0).asInt();
  if (code != 0) return response->SetError(code, Json::Value());
  response->SetSuccess("done");
}

// The description of the call. One source serves two methods, one of which is described as reading only.
void Context(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  const VORN::CallDescription& description = VORN::CallContext::Current()->description();
  Json::Value result;
  result["caller"] = description.caller;
  result["origin"] = description.origin;
  result["method"] = description.method;
  result["may_write"] = description.may_write;
  result["uploads"] = Json::arrayValue;
  for (const std::string& path : description.uploads) result["uploads"].append(path);
  response->SetSuccess(result);
}

const APIRow table[] = {{"Test.Echo", 1, "get", Echo},        {"Test.Echo", 1, "fail", Fail},
                        {"Test.Echo", 1, "throw", Throw},     {"Test.Echo", 1, "throw_number", ThrowNumber},
                        {"Test.Echo", 1, "silent", Silent},   {"Test.Echo", 1, "wait", Wait},
                        {"Test.Echo", 1, "root", Root},       {"Test.Echo", 1, "binary", Binary},
                        {"Test.Echo", 1, "upload", Upload},   {"Test.Echo", 2, "get", EchoV2},
                        {"Test.Echo", 1, "remark", Remark},   {"Test.Echo", 1, "context", Context},
                        {"Test.Echo", 2, "context", Context}, {"Test.Echo", 2, "wait", Wait},
                        {nullptr, 0, nullptr, nullptr}};

}  // namespace

extern "C" __attribute__((visibility("default"))) const void* GetAPITable() { return table; }

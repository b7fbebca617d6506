// The cost of the module in a request. Each method is measured beside a floor, which takes the same parameters and
// builds the same answer without the module.
#include <benchmark/benchmark.h>
#include <json/writer.h>

#include <cstdlib>
#include <cstring>
#include <string>

#include "entry_functions.h"
#include "memory_platform.h"

namespace {

Json::Value SetParameters() {
  Json::Value params;
  params["enable_nfs"] = true;
  params["enable_nfs_v4"] = true;
  params["nfs_v4_domain"] = kDomain;
  params["read_size"] = 8192;
  params["write_size"] = 16384;
  params["unix_pri_enable"] = false;
  return params;
}

Json::Value RejectedParameters() {
  Json::Value params = SetParameters();
  params["unix_pri_enable"] = "no";
  return params;
}

constexpr const char* kRuleSwitches[] = {"async", "insecure", "crossmnt"};
constexpr const char* kFlavours[] = {"sys", "kerberos", "kerberos_integrity", "kerberos_privacy"};

void Answer(benchmark::State& state, Entry entry, const Json::Value& params) {
  for (auto _ : state) {
    VORN::APIRequest request(params);
    VORN::APIResponse response;
    entry(&request, &response);
    benchmark::DoNotOptimize(response);
  }
}

void AnswerGet(VORN::APIRequest* /*request*/, VORN::APIResponse* response) {
  const NFSConfRecord& record = StoredRecord();
  Json::Value result;
  result["enable_nfs"] = true;
  result["enable_nfs_v4"] = record.enable_nfs_v4 != 0;
  result["nfs_v4_domain"] = kDomain;
  result["read_size"] = record.read_size;
  result["write_size"] = record.write_size;
  result["unix_pri_enable"] = record.unix_pri_enable != 0;
  response->SetSuccess(result);
}

// The floor of a change of settings reads each key once.
void AnswerSet(VORN::APIRequest* request, VORN::APIResponse* response) {
  const Json::Value params = request->GetParam("", Json::Value());
  for (const char* key :
       {"enable_nfs", "enable_nfs_v4", "nfs_v4_domain", "read_size", "write_size", "unix_pri_enable"}) {
    benchmark::DoNotOptimize(params[key].isNull());
  }
  response->SetSuccess(Json::Value());
}

Json::Value SaveParameters() {
  Json::Value params;
  params["share_name"] = "data";
  for (int i = 0; i < 20; ++i) {
    Json::Value rule;
    rule["client"] = "client" + std::to_string(i) + ".lab.example";
    rule["privilege"] = "rw";
    rule["root_squash"] = "guest";
    for (const char* key : kRuleSwitches) rule[key] = false;
    for (const char* key : kFlavours) rule["security_flavor"][key] = true;
    params["rule"].append(rule);
  }
  return params;
}

// The floor of a save reads each key of each rule once and fills one record per rule.
void AnswerSave(VORN::APIRequest* request, VORN::APIResponse* response) {
  const Json::Value params = request->GetParam("", Json::Value());
  benchmark::DoNotOptimize(params["share_name"].isString());
  auto* const list = static_cast<ExportRuleList*>(calloc(1, sizeof(ExportRuleList)));
  ExportRule** end = &list->first;
  for (const Json::Value& rule : params["rule"]) {
    *end = static_cast<ExportRule*>(calloc(1, sizeof(ExportRule)));
    const char* client = nullptr;
    const char* client_end = nullptr;
    rule["client"].getString(&client, &client_end);
    memcpy((*end)->client, client, static_cast<size_t>(client_end - client));
    for (const char* key : {"privilege", "root_squash"}) benchmark::DoNotOptimize(rule[key].isString());
    for (const char* key : kRuleSwitches) benchmark::DoNotOptimize(rule[key].asBool());
    const Json::Value& flavours = rule["security_flavor"];
    for (const char* key : kFlavours) benchmark::DoNotOptimize(flavours[key].asBool());
    end = &(*end)->next;
  }
  VORNNFSRuleExtFree(list);
  response->SetSuccess(Json::Value());
}

// The floor of a rejected request reads the parameters twice and logs them.
void AnswerRejected(VORN::APIRequest* request, VORN::APIResponse* response) {
  benchmark::DoNotOptimize(request->GetParam("", Json::Value()));
  response->SetError(2301, Json::Value());
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"
  benchmark::DoNotOptimize(Json::FastWriter().write(request->GetParam("", Json::Value())));
#pragma GCC diagnostic pop
}

const Json::Value kNone(Json::objectValue);

BENCHMARK_CAPTURE(Answer, , NFSGet, kNone)->Name("get");
BENCHMARK_CAPTURE(Answer, , AnswerGet, kNone)->Name("get/floor");
BENCHMARK_CAPTURE(Answer, , NFSSet, SetParameters())->Name("set without change");
BENCHMARK_CAPTURE(Answer, , AnswerSet, SetParameters())->Name("set without change/floor");
BENCHMARK_CAPTURE(Answer, , NFSSharePrivilegeSet, SaveParameters())->Name("save of 20 rules");
BENCHMARK_CAPTURE(Answer, , AnswerSave, SaveParameters())->Name("save of 20 rules/floor");
BENCHMARK_CAPTURE(Answer, , NFSSet, RejectedParameters())->Name("rejected set");
BENCHMARK_CAPTURE(Answer, , AnswerRejected, RejectedParameters())->Name("rejected set/floor");

}  // namespace

BENCHMARK_MAIN();

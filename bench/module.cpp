// What the module adds to a request: each method beside a floor that takes the same parameters and
// builds the same answer without it.
#include <benchmark/benchmark.h>
#include <json/writer.h>

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

// Whoever changes settings looks at each key once.
void AnswerSet(VORN::APIRequest* request, VORN::APIResponse* response) {
  const Json::Value params = request->GetParam("", Json::Value());
  for (const char* key :
       {"enable_nfs", "enable_nfs_v4", "nfs_v4_domain", "read_size", "write_size", "unix_pri_enable"}) {
    benchmark::DoNotOptimize(params[key].isNull());
  }
  response->SetSuccess(Json::Value());
}

// A rejected request is read twice and logged.
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
BENCHMARK_CAPTURE(Answer, , NFSSet, RejectedParameters())->Name("rejected set");
BENCHMARK_CAPTURE(Answer, , AnswerRejected, RejectedParameters())->Name("rejected set/floor");

}  // namespace

BENCHMARK_MAIN();

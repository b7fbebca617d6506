// The one fake platform of the module's tests: it behaves, in memory, as the contract says; it
// records what was called in which order; it fails on demand; and it counts what is not released.
#ifndef VORN_TESTS_SUPPORT_FAKE_PLATFORM_H
#define VORN_TESTS_SUPPORT_FAKE_PLATFORM_H

#include <json/value.h>

#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "core.h"
#include "nfsconf.h"
#include "webapi.h"

// One message that the module logged.
struct LogLine {
  int priority;
  std::string source;  // of the "source:line " that every text begins with; "" if it does not
  int line;
  std::string text;  // without that beginning
  size_t calls;      // how many the module had made by then
};

// A mapping or an account table in the order in which it was given.
using Pairs = std::vector<std::pair<std::string, std::string>>;

// The platform of one test: the last one made that still lives.
class FakePlatform {
 public:
  FakePlatform();
  ~FakePlatform();
  FakePlatform(const FakePlatform&) = delete;
  FakePlatform& operator=(const FakePlatform&) = delete;

  static FakePlatform& Current();

  // ---- what the box holds, for tests to set and to look at
  NFSConfRecord record{};
  bool has_domain = true;  // of the ID map, as its table
  bool has_table = true;
  std::string domain = "box.example";
  Pairs mappings;
  int enabled = 0;  // what KLIBServiceIsEnabled answers
  int kerberos_support = 1;
  std::map<std::string, std::string> shares{{"data", "/volume1/data"}};  // name to path
  std::vector<ExportRule> rules;                                         // of every share
  bool rules_listed_empty = false;  // a share without rules yields a list instead of none
  int rules_found = -1;             // what reading them answers, whatever is there; -1: what is
  int mount_point_result = 0;
  std::vector<std::string> users{"alice", "bob", "carol"};
  bool has_realm = true;
  std::string realm = "BOX.EXAMPLE";
  std::vector<KeytabEntry> keytab;
  int keytab_import_result = 0;
  std::vector<std::string> files;           // that KLIBCFileExist finds, besides those of the system
  std::vector<std::string> port_conflicts;  // "nfs_statd 4000"
  int done = 3;  // what an operation answers on success where every non-negative number says so

  // ---- what happened
  std::vector<std::string> calls;  // "KLIBServiceStop nfsd 0"; VornConf's end is "~VornConf"
  std::vector<LogLine> log;
  std::vector<std::string> failed_calls;  // the calls that failed on demand
  std::vector<std::string> LogTexts() const;
  // Returns the calls after the last one that failed or threw on demand.
  std::vector<std::string> CallsAfterFailure() const;

  // ---- what is still held
  std::map<std::string, int> live_objects;  // by kind; a kind of which none lives is not there

  // ---- failures on demand
  // The n-th call (from 1) that can fail does, counted over all operations.
  void FailCall(int n) { fail_at_ = n; }
  // The n-th call of `operation` does; 0 stands for every one.
  void Fail(const std::string& operation, int n = 0) { failing_[operation] = n; }
  // Sets the result of a failing integer operation; the default is -1.
  void FailWith(const std::string& operation, int result) { failure_results_[operation] = result; }
  // `operation` throws std::runtime_error("thrown on demand").
  void Throw(const std::string& operation) { throwing_ = operation; }
  // The n-th call (from 1) does, releases left out: those must not.
  void ThrowCall(int n) { throw_at_ = n; }

  // ---- for the operations' bodies
  void Record(const std::string& operation, const std::string& arguments = "");
  // Records a call that can fail, and whether it shall.
  bool Fails(const std::string& operation, const std::string& arguments = "");
  int FailureResult(const std::string& operation) const;
  void Born(const std::string& kind) { ++live_objects[kind]; }
  void Died(const std::string& kind);
  // The failing result of an operation that what the box holds makes fail.
  int Refuse();
  int last_error() const { return last_error_; }

 private:
  FakePlatform* const previous_;
  size_t failed_after_ = 0;  // calls made when the last one failed on demand, itself included
  int fail_at_ = 0;
  int calls_that_can_fail_ = 0;
  int throw_at_ = 0;
  int calls_that_can_throw_ = 0;
  int last_error_ = kNoFailure;
  std::map<std::string, int> failing_;
  std::map<std::string, int> counts_;
  std::map<std::string, int> failure_results_;
  std::string throwing_;

 public:
  // The results of KLIBCErrGet immediately after a failing call, and at any other time. A caller that reads the
  // reason too late therefore logs the wrong one.
  static constexpr int kReason = 0x0AB;
  static constexpr int kNoFailure = 0xDEAD;
};

// One answer of the module to one request.
struct Answer {
  int count = 0;  // how often it answered
  int code = -1;  // 0 for success
  Json::Value data;
};

// Strict JSON; a test's own mistake ends it.
Json::Value Parse(const std::string& json);

// Calls an entry function (or anything with its arguments) with the JSON text `params` as parameters.
template <typename Entry>
Answer Call(Entry entry, const std::string& params) {
  VORN::APIRequest request(Parse(params));
  VORN::APIResponse response;
  entry(&request, &response);
  Answer answer;
  for (const std::string& call : FakePlatform::Current().calls) {
    if (call == "SetSuccess" || call == "SetError") ++answer.count;
  }
  answer.code = response.answered() ? response.error() : -1;
  answer.data = response.data();
  return answer;
}

#endif  // VORN_TESTS_SUPPORT_FAKE_PLATFORM_H

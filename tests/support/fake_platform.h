// The fake platform of the module's tests. It implements the contract in memory, records all calls in
// order, fails or throws on demand, and counts objects that are not released. Not thread-safe.
#ifndef VORN_TESTS_SUPPORT_FAKE_PLATFORM_H
#define VORN_TESTS_SUPPORT_FAKE_PLATFORM_H

#include <json/value.h>

#include <map>
#include <memory>
#include <string>
#include <type_traits>
#include <utility>
#include <vector>

#include "access.h"
#include "clients.h"
#include "core.h"
#include "health.h"
#include "history.h"
#include "nfsconf.h"
#include "recorded_answers.h"
#include "webapi.h"

// A line that the module wrote to the system log.
struct LogLine {
  int priority;
  std::string source;  // the source name at the beginning of the line; "" if there is none
  int line;
  std::string text;  // the text behind "source:line "
  size_t calls;      // the number of calls that the module had made before
};

// Static mappings in the order in which they were given.
using Pairs = std::vector<std::pair<std::string, std::string>>;

// The platform of one test. The most recently constructed object that still exists is the current one.
class FakePlatform {
 public:
  FakePlatform();
  ~FakePlatform();
  FakePlatform(const FakePlatform&) = delete;
  FakePlatform& operator=(const FakePlatform&) = delete;

  static FakePlatform& Current();

  // ---- The state of the box. Tests set and read it.
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
  std::vector<std::string> files;                   // that KLIBCFileExist finds, besides those of the system
  std::vector<std::string> port_conflicts;          // "nfs_statd 4000"
  VORN::AccessAnswer access;                        // what every access is explained with
  std::vector<VORN::ClientAccess> client_accesses;  // the clients of every shared folder
  VORN::NFSClient client;                           // the only one of the list
  VORN::HealthReport health;                        // of every check
  VORN::HistoryEntry change;                        // the only one of the history
  int done = 3;  // what an operation answers on success where every non-negative number says so

  // ---- Recorded events.
  std::vector<std::string> calls;  // "KLIBServiceStop nfsd 0"; VornConf's end is "~VornConf"
  std::vector<LogLine> log;
  std::vector<std::string> failed_calls;  // the calls that failed on demand
  std::vector<std::string> LogTexts() const;
  // The calls after the last one that failed or threw on demand.
  std::vector<std::string> CallsAfterFailure() const;

  // ---- Objects that are not released.
  std::map<std::string, int> live_objects;  // number per kind; a kind without objects has no entry

  // ---- Failures on demand.
  // Makes the n-th call that can fail do so, from 1, counted over all operations.
  void FailCall(int n) { fail_at_ = n; }
  // Makes the n-th call of `operation` fail; 0: every call.
  void Fail(const std::string& operation, int n = 0) { failing_[operation] = n; }
  // Sets the result of a failing integer operation. The default is -1.
  void FailWith(const std::string& operation, int result) { failure_results_[operation] = result; }
  // Makes `operation` throw std::runtime_error("thrown on demand").
  void Throw(const std::string& operation) { throwing_ = operation; }
  // Makes the n-th call throw, from 1. Releases never throw and are not counted.
  void ThrowCall(int n) { throw_at_ = n; }

  // ---- For the implementations of the operations.
  void Record(const std::string& operation, const std::string& arguments = "");
  // Records a call that can fail, and returns whether it must fail.
  bool Fails(const std::string& operation, const std::string& arguments = "");
  int FailureResult(const std::string& operation) const;
  void Born(const std::string& kind) { ++live_objects[kind]; }
  void Died(const std::string& kind);
  // Returns the result of an operation that fails because of the state of the box.
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
  // The results of KLIBCErrGet directly after a failing call and at any other time. A log line with the
  // second value shows that the reason was read too late.
  static constexpr int kReason = 0x0AB;
  static constexpr int kNoFailure = 0xDEAD;
};

// The answer of the module to one request.
struct Answer {
  int count = 0;  // number of answers; one is right
  int code = -1;  // 0 for success
  Json::Value data;
};

// Parses strict JSON. Throws std::logic_error on a mistake in the test.
Json::Value Parse(const std::string& json);

// Calls an entry function, or another function with its parameters, with the JSON text `params`. The answers of entry
// functions are recorded, see recorded_answers.h.
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
  if constexpr (std::is_convertible_v<Entry, EntryFunction>) RecordAnswer(entry, Parse(params), answer);
  return answer;
}

#endif  // VORN_TESTS_SUPPORT_FAKE_PLATFORM_H

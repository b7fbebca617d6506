#include "entry_function.h"

#include <algorithm>
#include <optional>
#include <stdexcept>
#include <string_view>
#include <utility>
#include <vector>

#include "entity_tag.h"
#include "rehearsal.h"
#include "rehearsal_answer.h"

namespace vorn::server {
namespace {

// `parameters` are the tagged parameters of the call.
Response AnswerWithTag(std::string_view parameters, const Outcome& outcome) {
  const std::string data = WriteJson(outcome.data());
  Response response = SuccessWith(data, outcome.remarks);
  response.headers.emplace_back("ETag", EntityTagOf(parameters, data));
  return response;
}

// The method that shows what a changing call would change, and what it answers to the caller.
class PresentData {
 public:
  PresentData(const Route& changing, const Json::Value& parameters, VORN::CallDescription description)
      : changing_(changing), parameters_(parameters), description_(std::move(description)) {
    description_.method = changing.shown_by->Id();
    description_.may_write = false;
    description_.uploads.clear();
  }

  // Whether the tag is that of the present data, and the data is what this call would change.
  bool Matches(const std::string& tag) {
    const std::optional<Json::Value> parameters = ParametersOfTag(tag);
    if (!parameters || !HasSameSubject(*parameters)) return false;
    Read(*parameters);
    return outcome_->code() == 0 && MakeEntityTag(*parameters, WriteJson(outcome_->data())) == tag;
  }

  // The answer to a call whose condition does not hold. If the data cannot be read, it is the failure of the reading.
  // `rehearsal` is that of Remarks.
  Response Refuse(std::string rehearsal = "") {
    if (!outcome_) Read(Subject());
    outcome_->remarks.rehearsal = std::move(rehearsal);
    if (outcome_->code() != 0) return AnswerTo(*changing_.shown_by, *outcome_);
    Response response = Failure(412, 412, "This was changed meanwhile. The details are what is there now.",
                                outcome_->data(), {{}, {}, outcome_->remarks.rehearsal});
    const std::optional<std::string> tag = MakeEntityTag(read_with_, WriteJson(outcome_->data()));
    if (tag) response.headers.emplace_back("ETag", *tag);
    return response;
  }

 private:
  void Read(const Json::Value& parameters) {
    outcome_ = RunEntryFunction(*changing_.shown_by, parameters, description_);
    read_with_ = parameters;
  }

  // The parameters that both methods have, for example the name of a share.
  Json::Value Subject() const {
    Json::Value subject(Json::objectValue);
    for (const std::string& name : changing_.method.same) subject[name] = parameters_[name];
    return subject;
  }

  bool HasSameSubject(const Json::Value& parameters) const {
    const auto& names = changing_.method.same;
    return std::all_of(names.begin(), names.end(),
                       [&](const std::string& name) { return parameters[name] == parameters_[name]; });
  }

  const Route& changing_;
  const Json::Value& parameters_;
  VORN::CallDescription description_;
  std::optional<Outcome> outcome_;  // of the last reading
  Json::Value read_with_;           // its parameters
};

// Whether the data is what the value of an If-Match header names.
bool IsUnchanged(std::string_view if_match, PresentData* present) {
  const IfMatch condition = ParseIfMatch(if_match);
  return condition.any || std::any_of(condition.tags.begin(), condition.tags.end(),
                                      [present](const std::string& tag) { return present->Matches(tag); });
}

// Returns the reasons of a failed call: those of the platform. If it has none, and the code is about the parameters,
// the description of the method says which ones are faulty.
std::vector<std::string> ReasonsOf(const Route& route, int code, const std::vector<std::string>& of_platform,
                                   const VORN::APIRequest& request) {
  if (!of_platform.empty() || !route.descriptor->Describe(code).about_parameters) return of_platform;
  return route.descriptor->ParameterFaults("/api/" + route.Id(), request.GetParam("", Json::Value()));
}

// A caller with a token for some shared folders sees nothing of others: no unchanged lines, and no findings.
std::string ReportOf(const VORN::Draft& draft, bool sees_all) {
  Json::Value report = RehearsalJson(sees_all ? draft.Report() : draft.Report(0));
  if (sees_all) report["findings"] = FindingsJson(draft.CompareFindings());
  return WriteJson(report);
}

}  // namespace

Outcome RunEntryFunction(const Route& route, Json::Value parameters, VORN::CallDescription description) {
  VORN::CallContext context(std::move(description));
  VORN::APIRequest request(std::move(parameters));
  auto response = std::make_unique<VORN::APIResponse>();
  route.row.handler(&request, response.get());
  context.End();
  if (!response->answered()) throw std::runtime_error("the method ended without one");
  Remarks remarks;
  if (context.description().sees_remarks) remarks = {context.reasons(), context.warnings(), ""};
  const int code = response->error();
  remarks.reasons = code == 0 ? std::vector<std::string>() : ReasonsOf(route, code, remarks.reasons, request);
  return {std::move(response), std::move(remarks)};
}

Response AnswerTo(const Route& route, const Outcome& outcome) {
  if (outcome.code() == 0) return Success(outcome.data(), outcome.remarks);
  const Descriptor::ErrorCode code = route.descriptor->Describe(outcome.code());
  return Failure(code.status, outcome.code(), code.text, outcome.data(), outcome.remarks);
}

Response RunAndAnswer(const Route& route, Json::Value parameters, VORN::CallDescription description) {
  std::optional<std::string> tagged;
  if (route.method.reads_only) tagged = TaggedParameters(parameters);
  const Outcome outcome = RunEntryFunction(route, std::move(parameters), std::move(description));
  return tagged && outcome.code() == 0 ? AnswerWithTag(*tagged, outcome) : AnswerTo(route, outcome);
}

Response RunIfUnchanged(const Route& route, Json::Value parameters, VORN::CallDescription description,
                        std::string_view if_match) {
  const VORN::CallLock lock;
  if (!lock.held()) return Busy("Another change takes long. Try again soon.");
  PresentData present(route, parameters, description);
  if (!IsUnchanged(if_match, &present)) return present.Refuse();
  return RunAndAnswer(route, std::move(parameters), std::move(description));
}

Response Rehearse(const Route& route, Json::Value parameters, VORN::CallDescription description,
                  const std::optional<std::string>& if_match, bool sees_all) {
  const VORN::Draft draft;
  description.draft = &draft;
  if (if_match) {
    PresentData present(route, parameters, description);
    if (!IsUnchanged(*if_match, &present)) return present.Refuse(ReportOf(draft, sees_all));
  }
  Outcome outcome = RunEntryFunction(route, std::move(parameters), std::move(description));
  outcome.remarks.rehearsal = ReportOf(draft, sees_all);
  return AnswerTo(route, outcome);
}

}  // namespace vorn::server

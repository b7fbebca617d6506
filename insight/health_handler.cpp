#include "health_handler.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <string>
#include <variant>
#include <vector>

#include "health.h"
#include "json_values.h"
#include "log.h"
#include "page.h"
#include "parameter_reader.h"

namespace {

using Severity = VORN::HealthFinding::Severity;

constexpr char kSource[] = "health_handler";
constexpr int kUsualFindings = 1000;                                   // of a page
constexpr const char* kSeverities[] = {"error", "warning", "notice"};  // in the order of Severity

const char* NameOf(Severity severity) { return kSeverities[static_cast<std::size_t>(severity)]; }

// The findings that are wanted.
struct Question {
  Severity least = Severity::kNotice;
  std::string kind;   // empty: every one
  std::string share;  // empty: every one
  int offset = 0;
  int limit = kUsualFindings;

  bool Matches(const VORN::HealthFinding& finding) const {
    return finding.severity <= least && (kind.empty() || finding.kind == kind) &&
           (share.empty() || finding.subject.share == share);
  }
};

Question ReadQuestion(ParameterReader& reader) {
  Question question;
  const std::string severity = reader.Word("severity", "notice", kSeverities);
  const auto* const found = std::find(std::begin(kSeverities), std::end(kSeverities), severity);
  if (found != std::end(kSeverities)) question.least = static_cast<Severity>(found - std::begin(kSeverities));
  question.kind = reader.Text("kind");
  question.share = reader.Text("share");
  question.offset = reader.Integer("offset", 0);
  question.limit = reader.Integer("limit", kUsualFindings);
  return question;
}

Json::Value ToJson(const VORN::HealthSubject& subject) {
  Json::Value item;
  item["share"] = OrNull(subject.share);
  item["client"] = OrNull(subject.client);
  item["file"] = OrNull(subject.file);
  item["line"] = subject.line == 0 ? Json::Value() : Json::Value(subject.line);
  item["setting"] = OrNull(subject.setting);
  item["mapping"] = OrNull(subject.mapping);
  return item;
}

Json::Value ToJson(const VORN::HealthCall::Parameter& parameter) {
  if (const auto* texts = std::get_if<std::vector<std::string>>(&parameter)) return ArrayOf(*texts);
  if (const auto* text = std::get_if<std::string>(&parameter)) return *text;
  return std::get<bool>(parameter);
}

Json::Value ToJson(const VORN::HealthCall& call) {
  if (call.api.empty()) return {};
  Json::Value item;
  item["api"] = call.api;
  item["version"] = call.version;
  item["method"] = call.method;
  item["parameters"] = Json::Value(Json::objectValue);
  for (const auto& [name, parameter] : call.parameters) item["parameters"][name] = ToJson(parameter);
  return item;
}

Json::Value ToJson(const VORN::HealthFinding& finding) {
  Json::Value item;
  item["kind"] = finding.kind;
  item["severity"] = NameOf(finding.severity);
  item["subject"] = ToJson(finding.subject);
  item["text"] = finding.text;
  item["remedy"] = finding.remedy;
  item["call"] = ToJson(finding.call);
  return item;
}

Json::Value ToJson(const VORN::HealthGap& gap) {
  Json::Value item;
  item["kind"] = gap.kind;
  item["reason"] = gap.reason;
  return item;
}

Json::Value Count(const std::vector<const VORN::HealthFinding*>& findings) {
  Json::Value counts;
  for (const char* name : kSeverities) counts[name] = 0;
  for (const VORN::HealthFinding* finding : findings) {
    Json::Value& count = counts[NameOf(finding->severity)];
    count = count.asInt() + 1;
  }
  return counts;
}

}  // namespace

void HealthHandler::Check() {
  AnswerWith(HERE, [this](Json::Value& result) { return CheckData(Parameters(), result); });
}

bool HealthHandler::CheckData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  const Question question = ReadQuestion(reader);
  if (!reader.ok()) return Fail(kBadParameter);
  const VORN::HealthReport report = VORN::CheckHealth();
  std::vector<const VORN::HealthFinding*> matching;
  for (const VORN::HealthFinding& finding : report.findings) {
    if (question.Matches(finding)) matching.push_back(&finding);
  }
  const int count = static_cast<int>(matching.size());
  const Page page = Page::Of(count, question.offset, question.limit);
  result["findings"] = Json::Value(Json::arrayValue);
  for (auto at = matching.begin() + page.begin; at != matching.begin() + page.end; ++at) {
    result["findings"].append(ToJson(**at));
  }
  result["total"] = count;
  result["counts"] = Count(matching);
  result["not_checked"] = Json::Value(Json::arrayValue);
  for (const VORN::HealthGap& gap : report.not_checked) {
    if (question.kind.empty() || gap.kind == question.kind) result["not_checked"].append(ToJson(gap));
  }
  return true;
}

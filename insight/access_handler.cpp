#include "access_handler.h"

#include <optional>
#include <string>
#include <vector>

#include "access.h"
#include "core.h"
#include "folder_listing.h"
#include "json_values.h"
#include "log.h"
#include "page.h"
#include "parameter_reader.h"

namespace {

constexpr char kSource[] = "access_handler";
constexpr const char* kFlavors[] = {"sys", "krb5", "krb5i", "krb5p"};
constexpr const char* kVersions[] = {"3", "4", "4.0", "4.1", "4.2"};
constexpr char kNewestVersion[] = "4.2";
constexpr int kLargestPort = 65535;

// The parameters that the methods have in common.
VORN::AccessQuestion ReadClient(ParameterReader& reader) {
  VORN::AccessQuestion question;
  question.client = reader.NeededText("client");
  question.flavor = reader.Word("flavor", "sys", kFlavors);
  question.version = reader.Word("version", kNewestVersion, kVersions);
  if (question.version == "4") question.version = kNewestVersion;
  question.port = static_cast<int>(reader.Integer("port", 0, 1, kLargestPort));
  question.user = reader.Text("user");
  question.groups = reader.Texts("groups");
  return question;
}

// Adds where something is written; null if no file says it.
void SetPlace(const std::string& file, int line, Json::Value* item) {
  (*item)["file"] = OrNull(file);
  (*item)["line"] = file.empty() ? Json::Value() : Json::Value(line);
}

Json::Value ToJson(const VORN::AccessRule& rule) {
  Json::Value item;
  item["directory"] = rule.directory;
  item["client"] = rule.client;
  item["kind"] = rule.kind;
  item["reason"] = rule.reason;
  item["text"] = rule.text;
  SetPlace(rule.file, rule.line, &item);
  return item;
}

Json::Value ToJson(const VORN::AccessIdentity& identity) {
  Json::Value item;
  item["uid"] = identity.user_id;
  item["gid"] = identity.group_id;
  item["groups"] = ArrayOf(identity.groups);
  item["by"] = identity.by;
  item["text"] = identity.text;
  SetPlace(identity.file, identity.line, &item);
  return item;
}

const char* NameOf(VORN::AccessCheck::Result result) {
  if (result == VORN::AccessCheck::Result::kPassed) return "passed";
  return result == VORN::AccessCheck::Result::kFailed ? "failed" : "unknown";
}

Json::Value ToJson(const VORN::AccessCheck& check) {
  Json::Value item;
  item["check"] = check.check;
  item["result"] = NameOf(check.result);
  item["text"] = check.text;
  item["remedy"] = OrNull(check.remedy);
  return item;
}

Json::Value ToJson(const VORN::AccessAnswer& answer) {
  Json::Value result;
  result["path"] = answer.path;
  result["addresses"] = ArrayOf(answer.addresses);
  result["names"] = ArrayOf(answer.names);
  result["mountable"] = answer.mountable;
  result["read"] = answer.read;
  result["write"] = answer.write;
  result["rule"] = answer.rule ? ToJson(*answer.rule) : Json::Value();
  result["others"] = ArrayOf(answer.others, ToJson);
  result["identity"] = answer.identity ? ToJson(*answer.identity) : Json::Value();
  result["checks"] = ArrayOf(answer.checks, ToJson);
  return result;
}

// A row of the matrix.
Json::Value ToRow(const std::string& share, const VORN::AccessAnswer& answer) {
  Json::Value row;
  row["share"] = share;
  row["path"] = answer.path;
  row["mountable"] = answer.mountable;
  row["read"] = answer.read;
  row["write"] = answer.write;
  row["rule"] = answer.rule ? Json::Value(answer.rule->client) : Json::Value();
  return row;
}

int CodeOf(int result) {
  if (result == VORN::kAccessNoShare) return kNoShare;
  if (result == VORN::kAccessNoUser) return kNoUser;
  if (result == VORN::kAccessNoGroup) return kNoGroup;
  return kPlatformFailure;
}

}  // namespace

void AccessHandler::Explain() {
  AnswerWith(HERE, [this](Json::Value& result) { return ExplainData(Parameters(), result); });
}

void AccessHandler::Matrix() {
  AnswerWith(HERE, [this](Json::Value& result) { return MatrixData(Parameters(), result); });
}

bool AccessHandler::ExplainData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  VORN::AccessQuestion question = ReadClient(reader);
  question.share = reader.NeededText("share");
  if (!reader.ok()) return Fail(kBadParameter);
  VORN::AccessAnswer answer;
  const int explained = VORN::ExplainAccess(question, &answer);
  if (explained < 0) {
    LOG_ERROR("Failed to ExplainAccess, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(explained));
  }
  result = ToJson(answer);
  return true;
}

bool AccessHandler::MatrixData(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  const VORN::AccessQuestion question = ReadClient(reader);
  const int offset = reader.Integer("offset", 0);
  const int limit = reader.Integer("limit", -1);
  if (!reader.ok()) return Fail(kBadParameter);
  const std::optional<std::vector<Folder>> folders = ReadFolders(HERE);
  if (!folders) return Fail(kPlatformFailure);
  const int count = static_cast<int>(folders->size());
  const Page page = Page::Of(count, offset, limit);
  std::vector<std::string> shares;
  for (int at = page.begin; at < page.end; ++at) shares.push_back((*folders)[static_cast<std::size_t>(at)].name);
  std::vector<VORN::AccessAnswer> answers;
  const int explained = VORN::ExplainAccesses(question, shares, &answers);
  if (explained < 0) {
    LOG_ERROR("Failed to ExplainAccesses, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(explained));
  }
  result["access"] = Json::Value(Json::arrayValue);
  for (std::size_t at = 0; at < answers.size(); ++at) result["access"].append(ToRow(shares[at], answers[at]));
  result["total"] = count;
  return true;
}

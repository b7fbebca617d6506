#include "access_handler.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <string>
#include <vector>

#include "access.h"
#include "core.h"
#include "folder_listing.h"
#include "json_values.h"
#include "listing_page.h"
#include "log.h"
#include "page.h"
#include "parameter_reader.h"

namespace {

constexpr char kSource[] = "access_handler";
constexpr const char* kFlavors[] = {"sys", "krb5", "krb5i", "krb5p"};
constexpr const char* kVersions[] = {"3", "4", "4.0", "4.1", "4.2"};
constexpr char kNewestVersion[] = "4.2";
constexpr int kLargestPort = 65535;

// The parameters that the methods have in common. `flavor` and `version` count if the caller names none.
VORN::AccessQuestion ReadMount(ParameterReader& reader, const char* flavor, const char* version) {
  VORN::AccessQuestion question;
  question.flavor = reader.Word("flavor", flavor, kFlavors);
  question.version = reader.Word("version", version, kVersions);
  if (question.version == "4") question.version = kNewestVersion;
  question.port = static_cast<int>(reader.Integer("port", 0, 1, kLargestPort));
  question.user = reader.Text("user");
  question.groups = reader.Texts("groups");
  return question;
}

VORN::AccessQuestion ReadClient(ParameterReader& reader) {
  VORN::AccessQuestion question = ReadMount(reader, "sys", kNewestVersion);
  question.client = reader.NeededText("client");
  return question;
}

// A user belongs to one flavour: a name is not a Kerberos principal.
std::vector<std::string> FlavorsOf(const VORN::AccessQuestion& question) {
  if (!question.flavor.empty()) return {question.flavor};
  if (!question.user.empty()) return {"sys"};
  return {std::begin(kFlavors), std::end(kFlavors)};
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

// The rights in an answer, or those of a flavor.
template <typename Access>
void AddRights(const Access& access, Json::Value* result) {
  (*result)["mountable"] = access.mountable;
  (*result)["read"] = access.read;
  (*result)["write"] = access.write;
}

Json::Value ToJson(const VORN::AccessAnswer& answer) {
  Json::Value result;
  result["path"] = answer.path;
  result["addresses"] = ArrayOf(answer.addresses);
  result["names"] = ArrayOf(answer.names);
  AddRights(answer, &result);
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
  AddRights(answer, &row);
  row["rule"] = answer.rule ? Json::Value(answer.rule->client) : Json::Value();
  return row;
}

Json::Value ToJson(const VORN::FlavorAccess& access) {
  Json::Value item;
  item["flavor"] = access.flavor;
  AddRights(access, &item);
  return item;
}

Json::Value ToJson(const VORN::ClientAccess& access) {
  Json::Value item;
  item["client"] = access.client;
  item["kind"] = OrNull(access.kind);
  item["state"] = OrNull(access.state);
  item["address"] = OrNull(access.address);
  item["version"] = access.version;
  item["rule"] = access.rule ? ToJson(*access.rule) : Json::Value();
  item["flavors"] = ArrayOf(access.flavors, ToJson);
  item["text"] = OrNull(access.text);
  return item;
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
  result["access"] = Json::Value(Json::arrayValue);
  result["clients"] = Json::Value(Json::arrayValue);
  if (params["share"].isNull()) return ListShares(params, result);
  if (params["client"].isNull()) return ListClients(params, result);
  LOG_ERROR("variables 'client' and 'share' exclude each other.");
  return Fail(kBadParameter);
}

bool AccessHandler::ListShares(const Json::Value& params, Json::Value& result) {
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
  for (std::size_t at = 0; at < answers.size(); ++at) result["access"].append(ToRow(shares[at], answers[at]));
  result["total"] = count;
  return true;
}

bool AccessHandler::ListClients(const Json::Value& params, Json::Value& result) {
  ParameterReader reader(HERE, params);
  VORN::ClientsQuestion question;
  question.access = ReadMount(reader, "", "");
  question.access.share = reader.NeededText("share");
  question.flavors = FlavorsOf(question.access);
  question.offset = static_cast<std::size_t>(std::max(reader.Integer("offset", 0), 0));
  const int limit = reader.Integer("limit", -1);
  question.limit =
      static_cast<std::size_t>(limit == -1 ? ListingPage::kMost : std::clamp(limit, 0, ListingPage::kMost));
  if (!reader.ok()) return Fail(kBadParameter);
  std::vector<VORN::ClientAccess> clients;
  int total = 0;
  const int explained = VORN::ExplainClients(question, &clients, &total);
  if (explained < 0) {
    LOG_ERROR("Failed to ExplainClients, vornerr=[0x%04X]", KLIBCErrGet());
    return Fail(CodeOf(explained));
  }
  result["clients"] = ArrayOf(clients, ToJson);
  result["total"] = total;
  return true;
}

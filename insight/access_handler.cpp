#include "access_handler.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "access.h"
#include "core.h"
#include "json_text.h"
#include "log.h"
#include "owned.h"
#include "page.h"
#include "shared_folders.h"

namespace {

constexpr char kSource[] = "access_handler";
constexpr const char* kFlavors[] = {"sys", "krb5", "krb5i", "krb5p"};
constexpr const char* kVersions[] = {"3", "4", "4.0", "4.1", "4.2"};
constexpr char kNewestVersion[] = "4.2";
constexpr int kLargestPort = 65535;

// Reads the parameters of a question. The first faulty one is logged.
class ParameterReader {
 public:
  explicit ParameterReader(const Json::Value& params) : params_(params) {}

  bool ok() const { return ok_; }

  // A string without NUL bytes; "" if the parameter is absent or null. `is_needed`: it must not be empty.
  std::string Text(const char* name, bool is_needed = false) {
    const Json::Value& value = params_[name];
    if (value.isNull() && !is_needed) return "";
    std::optional<std::string> text = PlainText(value);
    if (!text || (is_needed && text->empty())) return Refuse(name);
    return *text;
  }

  // One of `words`; the first argument if the parameter is absent or null.
  template <std::size_t kSize>
  std::string Word(const char* fallback, const char* name, const char* const (&words)[kSize]) {
    if (params_[name].isNull()) return fallback;
    const std::string word = Text(name);
    return std::find(std::begin(words), std::end(words), word) != std::end(words) ? word : Refuse(name);
  }

  // A port; 0 if the parameter is absent or null.
  int Port(const char* name) {
    const Json::Value& value = params_[name];
    if (value.isNull()) return 0;
    if (value.isInt() && value.asInt() >= 1 && value.asInt() <= kLargestPort) return value.asInt();
    Refuse(name);
    return 0;
  }

  // An integer; `fallback` if the parameter is absent or null.
  int Integer(const char* name, int fallback) {
    const Json::Value& value = params_[name];
    if (value.isNull()) return fallback;
    if (value.isInt()) return value.asInt();
    Refuse(name);
    return fallback;
  }

  std::vector<std::string> Texts(const char* name) {
    const Json::Value& value = params_[name];
    std::vector<std::string> texts;
    if (value.isNull()) return texts;
    if (!value.isArray()) Refuse(name);
    for (const Json::Value& item : value.isArray() ? value : Json::Value(Json::arrayValue)) {
      std::optional<std::string> text = PlainText(item);
      if (!text || text->empty()) Refuse(name);
      texts.push_back(text.value_or(""));
    }
    return texts;
  }

 private:
  static std::optional<std::string> PlainText(const Json::Value& value) {
    const std::optional<std::string_view> text = TextOf(value);
    if (!text || text->find('\0') != std::string_view::npos) return std::nullopt;
    return std::string(*text);
  }

  std::string Refuse(const char* name) {
    if (ok_) LOG_ERROR("variable '%s' is missing or not accepted.", name);
    ok_ = false;
    return "";
  }

  const Json::Value& params_;
  bool ok_ = true;
};

// The parameters that the methods have in common.
VORN::AccessQuestion ReadClient(ParameterReader& reader) {
  VORN::AccessQuestion question;
  question.client = reader.Text("client", true);
  question.flavor = reader.Word("sys", "flavor", kFlavors);
  question.version = reader.Word(kNewestVersion, "version", kVersions);
  if (question.version == "4") question.version = kNewestVersion;
  question.port = reader.Port("port");
  question.user = reader.Text("user");
  question.groups = reader.Texts("groups");
  return question;
}

template <typename T>
Json::Value ToArray(const std::vector<T>& values) {
  Json::Value array(Json::arrayValue);
  for (const T& value : values) array.append(value);
  return array;
}

// Adds where something is written; null if no file says it.
void SetPlace(const std::string& file, int line, Json::Value* item) {
  (*item)["file"] = file.empty() ? Json::Value() : Json::Value(file);
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
  item["groups"] = ToArray(identity.groups);
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
  item["remedy"] = check.remedy.empty() ? Json::Value() : Json::Value(check.remedy);
  return item;
}

template <typename T>
Json::Value ToJson(const std::vector<T>& items) {
  Json::Value array(Json::arrayValue);
  for (const T& item : items) array.append(ToJson(item));
  return array;
}

Json::Value ToJson(const VORN::AccessAnswer& answer) {
  Json::Value result;
  result["path"] = answer.path;
  result["addresses"] = ToArray(answer.addresses);
  result["names"] = ToArray(answer.names);
  result["mountable"] = answer.mountable;
  result["read"] = answer.read;
  result["write"] = answer.write;
  result["rule"] = answer.rule ? ToJson(*answer.rule) : Json::Value();
  result["others"] = ToJson(answer.others);
  result["identity"] = answer.identity ? ToJson(*answer.identity) : Json::Value();
  result["checks"] = ToJson(answer.checks);
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

// The names of all shared folders in the order of their bytes; nullopt if they cannot be read.
std::optional<std::vector<std::string>> ReadShareNames() {
  StringHash shares(KLIBCSzHashAlloc(0));
  StringList names(KLIBCSzListAlloc(0));
  if (!shares || !names || VORNShareEnum(shares.slot()) < 0 || KLIBCSzHashEnumKey(shares.get(), names.slot()) < 0) {
    LOG_ERROR("Failed to VORNShareEnum, vornerr=[0x%04X]", KLIBCErrGet());
    return std::nullopt;
  }
  std::vector<std::string> sorted;
  sorted.reserve(static_cast<std::size_t>(names.get()->count));
  for (int i = 0; i < names.get()->count; ++i) sorted.emplace_back(KLIBCSzListGet(names.get(), i));
  std::sort(sorted.begin(), sorted.end());
  return sorted;
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
  ParameterReader reader(params);
  VORN::AccessQuestion question = ReadClient(reader);
  question.share = reader.Text("share", true);
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
  ParameterReader reader(params);
  const VORN::AccessQuestion question = ReadClient(reader);
  const int offset = reader.Integer("offset", 0);
  const int limit = reader.Integer("limit", -1);
  if (!reader.ok()) return Fail(kBadParameter);
  const std::optional<std::vector<std::string>> names = ReadShareNames();
  if (!names) return Fail(kPlatformFailure);
  const int count = static_cast<int>(names->size());
  const Page page = Page::Of(count, offset, limit);
  const std::vector<std::string> shares(names->begin() + page.begin, names->begin() + page.end);
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

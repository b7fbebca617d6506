#include "body.h"

#include "answer.h"
#include "json_input.h"

namespace vorn::server {

bool IsReservedName(std::string_view name) {
  return name.size() >= kUploadSuffix.size() && name.substr(name.size() - kUploadSuffix.size()) == kUploadSuffix;
}

Response ReservedName(std::string_view name) {
  return Refusal(400,
                 "The parameter \"" + std::string(name) + "\" is set by the server alone; upload the file itself.");
}

Response JsonBody::TooLarge() { return Refusal(413, "The parameters are larger than 1 MiB."); }

std::optional<Response> JsonBody::Receive(std::string_view piece) {
  if (piece.size() > kMaxBytes - text_.size()) return TooLarge();
  text_ += piece;
  return std::nullopt;
}

std::variant<Json::Value, Response> JsonBody::TakeParameters() {
  if (text_.empty()) return Json::Value(Json::objectValue);
  std::string error;
  std::optional<Json::Value> parameters = ParseJsonObject(text_, &error);
  if (!parameters) return Refusal(400, "The parameters are not valid JSON. " + error + ".");
  for (auto member = parameters->begin(); member != parameters->end(); ++member) {
    if (IsReservedName(member.name())) return ReservedName(member.name());
  }
  return *std::move(parameters);
}

}  // namespace vorn::server

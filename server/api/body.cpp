#include "body.h"

#include <algorithm>

#include "answer.h"
#include "json_input.h"
#include "memory.h"

namespace vorn::server {
namespace {

// A request with at least this charge, for example a tree of 20,000 values, returns its memory to the system
// immediately.
constexpr std::size_t kMuchMemory = std::size_t{8} * 1024 * 1024;

Response NotJson(int status, const std::string& error) {
  return Refusal(status, "The parameters are not valid JSON. " + error + ".");
}

}  // namespace

void Body::Announce(std::uint64_t length) {
  announced_ = static_cast<std::size_t>(std::min<std::uint64_t>(length, most_bytes_));
}

std::optional<Response> Body::Receive(std::string_view piece) {
  if (piece.size() > most_bytes_ - text_.size()) return too_large_();
  if (auto refusal = Check(piece)) return refusal;
  if (text_.capacity() < announced_) text_.reserve(announced_);
  text_ += piece;
  return std::nullopt;
}

bool IsReservedName(std::string_view name) {
  return name.size() >= kUploadSuffix.size() && name.substr(name.size() - kUploadSuffix.size()) == kUploadSuffix;
}

Response ReservedName(std::string_view name) {
  return Refusal(400,
                 "The parameter \"" + std::string(name) + "\" is set by the server alone; upload the file itself.");
}

Response JsonBody::TooLarge() { return Refusal(413, "The parameters are larger than 1 MiB."); }

// The parameters have been destroyed before.
JsonBody::~JsonBody() {
  if (charge_ && charge_->amount() >= kMuchMemory) ReturnFreeMemory();
}

std::variant<Json::Value, Response> JsonBody::TakeParameters() {
  if (text().empty()) return Json::Value(Json::objectValue);
  return Parse();
}

std::variant<Json::Value, Response> JsonBody::Parse() {
  JsonFault fault;
  const std::optional<JsonText> checked = JsonText::Check(text(), &fault);
  if (!checked) return NotJson(fault.too_large ? 413 : 400, fault.text);
  const std::size_t cost = checked->cost() * kCopies;
  charge_ = budget_.Take("", cost);
  if (!charge_ && !budget_.HasRoomFor("", cost)) {
    return Refusal(413, "The settings of this server leave no memory for parameters of this size.");
  }
  if (!charge_) return Busy("The server has no memory left for parameters of this size. Try again soon.");
  std::string error;
  std::optional<Json::Value> parameters = checked->ParseObject(&error);
  if (!parameters) return NotJson(400, error);
  for (auto member = parameters->begin(); member != parameters->end(); ++member) {
    if (IsReservedName(member.name())) return ReservedName(member.name());
  }
  return *std::move(parameters);
}

}  // namespace vorn::server

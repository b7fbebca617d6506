#include "form_check.h"

#include <utility>

#include "answer.h"
#include "body.h"
#include "json_input.h"

namespace vorn::server {
namespace {

std::string Quoted(const std::string& name) { return "\"" + name + "\""; }

}  // namespace

std::string ParameterOf(const PartHead& part) {
  return part.is_file ? part.name + std::string(kUploadSuffix) : part.name;
}

std::optional<Response> FormCheck::Feed(std::string_view piece) {
  if (parser_.Feed(piece)) return std::nullopt;
  if (refusal_) return std::exchange(refusal_, std::nullopt);
  return Refusal(400, "The form is malformed: " + parser_.error() + ".");
}

bool FormCheck::BeginPart(const PartHead& head) {
  part_ = head;
  part_bytes_ = 0;
  if (++parts_ > kMaxParts) return Refuse(413, "The form has more than 8 parts.");
  if (!IsPlainUtf8(head.name)) return Refuse(400, "The name of a part is not UTF-8.");
  if (IsReservedName(head.name)) {
    refusal_ = ReservedName(head.name);
    return false;
  }
  return parameters_.insert(ParameterOf(head)).second || Refuse(400, "The part " + Quoted(head.name) + " comes twice.");
}

bool FormCheck::PartData(std::string_view data) {
  part_bytes_ += data.size();
  if (part_bytes_ <= (part_.is_file ? kMaxFileBytes : kMaxTextBytes)) return true;
  return Refuse(413, "The part " + Quoted(part_.name) + " is larger than " + (part_.is_file ? "1 MiB." : "64 KiB."));
}

bool FormCheck::Refuse(int status, const std::string& text) {
  refusal_ = Refusal(status, text);
  return false;
}

}  // namespace vorn::server

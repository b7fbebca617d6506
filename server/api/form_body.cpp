#include "form_body.h"

#include <syslog.h>

#include <cerrno>
#include <cstring>
#include <utility>

#include "answer.h"
#include "json_input.h"

namespace vorn::server {
namespace {

constexpr std::size_t kMaxTextBytes = std::size_t{64} * 1024;  // of one part

std::string Quoted(const std::string& name) { return "\"" + name + "\""; }

}  // namespace

Response FormBody::TooLarge() { return Refusal(413, "The form is larger than a file of 1 MiB and its envelope."); }

FormBody::FormBody(const std::string& boundary, const UploadFolder& uploads)
    : uploads_(uploads), parser_(boundary, *this) {}

std::optional<Response> FormBody::Receive(std::string_view piece) {
  received_ += piece.size();
  if (received_ > kMaxBytes) return TooLarge();
  if (parser_.Feed(piece)) return std::nullopt;
  if (!refusal_) Refuse(Refusal(400, "The form is malformed: " + parser_.error() + "."));
  return refusal_;
}

std::variant<Json::Value, Response> FormBody::TakeParameters() {
  if (!parser_.complete()) return Refusal(400, "The form ends before its closing boundary.");
  return std::move(parameters_);
}

std::vector<std::string> FormBody::Uploads() const {
  std::vector<std::string> paths;
  for (const Upload& file : files_) paths.push_back(file.path());
  return paths;
}

bool FormBody::BeginPart(const PartHead& head) {
  part_ = head;
  part_bytes_ = 0;
  text_.clear();
  if (!IsPlainUtf8(head.name)) return Refuse(Refusal(400, "The name of a part is not UTF-8."));
  if (IsReservedName(head.name)) return Refuse(ReservedName(head.name));
  const std::string parameter = head.is_file ? head.name + std::string(kUploadSuffix) : head.name;
  if (parameters_.isMember(parameter)) return Refuse(Refusal(400, "The part " + Quoted(head.name) + " comes twice."));
  return !head.is_file || BeginFile(parameter);
}

bool FormBody::BeginFile(const std::string& parameter) {
  std::optional<Upload> file = uploads_.Create();
  if (!file) return CannotStore();
  parameters_[parameter] = file->path();
  files_.push_back(std::move(*file));
  return true;
}

bool FormBody::PartData(std::string_view data) {
  part_bytes_ += data.size();
  if (part_bytes_ > (part_.is_file ? kMaxFileBytes : kMaxTextBytes)) {
    return Refuse(
        Refusal(413, "The part " + Quoted(part_.name) + " is larger than " + (part_.is_file ? "1 MiB." : "64 KiB.")));
  }
  if (part_.is_file) return files_.back().Append(data) || CannotStore();
  text_ += data;
  return true;
}

bool FormBody::EndPart() {
  if (part_.is_file) return true;
  if (!IsPlainUtf8(text_)) return Refuse(Refusal(400, "The part " + Quoted(part_.name) + " is not UTF-8 text."));
  parameters_[part_.name] = text_;
  return true;
}

bool FormBody::Refuse(Response response) {
  refusal_ = std::move(response);
  return false;
}

bool FormBody::CannotStore() {
  syslog(LOG_ERR, "An upload cannot be stored: %s", std::strerror(errno));
  return Refuse(Failure(500, kInternalFailure, "The uploaded file could not be stored; the server's log says more."));
}

}  // namespace vorn::server

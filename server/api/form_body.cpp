#include "form_body.h"

#include <syslog.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <utility>

#include "answer.h"
#include "json_input.h"

namespace vorn::server {
namespace {

constexpr std::size_t kPieceBytes = std::size_t{64} * 1024;
constexpr std::size_t kMaxTextBytes = std::size_t{64} * 1024;  // of one part

std::string Quoted(const std::string& name) { return "\"" + name + "\""; }

}  // namespace

Response FormBody::TooLarge() { return Refusal(413, "The form is larger than a file of 1 MiB and its envelope."); }

FormBody::FormBody(std::string boundary, const UploadFolder& uploads)
    : Body(kMaxBytes, TooLarge), boundary_(std::move(boundary)), uploads_(uploads) {}

std::variant<Json::Value, Response> FormBody::TakeParameters() {
  MultipartParser parser(boundary_, *this);
  // In pieces, because the parser copies each one.
  for (std::string_view rest = text(); !rest.empty(); rest.remove_prefix(std::min(rest.size(), kPieceBytes))) {
    if (parser.Feed(rest.substr(0, kPieceBytes))) continue;
    if (refusal_) return *std::move(refusal_);
    return Refusal(400, "The form is malformed: " + parser.error() + ".");
  }
  if (!parser.complete()) return Refusal(400, "The form ends before its closing boundary.");
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
  part_text_.clear();
  if (++parts_ > kMaxParts) return Refuse(Refusal(413, "The form has more than 8 parts."));
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
  part_text_ += data;
  return true;
}

bool FormBody::EndPart() {
  if (part_.is_file) return files_.back().Close() || CannotStore();
  if (!IsPlainUtf8(part_text_)) return Refuse(Refusal(400, "The part " + Quoted(part_.name) + " is not UTF-8 text."));
  parameters_[part_.name] = part_text_;
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

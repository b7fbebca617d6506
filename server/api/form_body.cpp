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

// The size of a piece, because the parser copies each piece.
constexpr std::size_t kPieceBytes = std::size_t{64} * 1024;

}  // namespace

Response FormBody::TooLarge() { return Refusal(413, "The form is larger than a file of 1 MiB and its envelope."); }

FormBody::FormBody(std::string boundary, const UploadFolder& uploads)
    : Body(kMaxBytes, TooLarge), boundary_(std::move(boundary)), uploads_(uploads), check_(boundary_) {}

std::optional<Response> FormBody::Check(std::string_view piece) { return check_.Feed(piece); }

std::variant<Json::Value, Response> FormBody::TakeParameters() {
  if (!check_.complete()) return Refusal(400, "The form ends before its closing boundary.");
  MultipartParser parser(boundary_, *this);
  for (std::string_view rest = text(); !rest.empty(); rest.remove_prefix(std::min(rest.size(), kPieceBytes))) {
    if (!parser.Feed(rest.substr(0, kPieceBytes))) return *std::move(refusal_);
  }
  return std::move(parameters_);
}

std::vector<std::string> FormBody::Uploads() const {
  std::vector<std::string> paths;
  for (const Upload& file : files_) paths.push_back(file.path());
  return paths;
}

bool FormBody::BeginPart(const PartHead& head) {
  part_ = head;
  part_text_.clear();
  if (!head.is_file) return true;
  std::optional<Upload> file = uploads_.Create();
  if (!file) return CannotStore();
  parameters_[ParameterOf(head)] = file->path();
  files_.push_back(std::move(*file));
  return true;
}

bool FormBody::PartData(std::string_view data) {
  if (part_.is_file) return files_.back().Append(data) || CannotStore();
  part_text_ += data;
  return true;
}

bool FormBody::EndPart() {
  if (part_.is_file) return files_.back().Close() || CannotStore();
  if (!IsPlainUtf8(part_text_)) return Refuse(Refusal(400, "The part \"" + part_.name + "\" is not UTF-8 text."));
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

// Parameters and files in a form.
#ifndef VORN_SERVER_FORM_BODY_H
#define VORN_SERVER_FORM_BODY_H

#include <json/value.h>

#include <cstddef>
#include <list>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "body.h"
#include "form_check.h"
#include "multipart.h"
#include "upload.h"

namespace vorn::server {

// multipart/form-data. A part that is text is a parameter. A part that is a file is stored in a file of its own; the
// parameter NAME_tmp is the path of that file. The form is checked while it is received; files are made by
// TakeParameters().
class FormBody : public Body, private PartReceiver {
 public:
  // A file of the largest size, other parts, and the boundaries and heads around them.
  static constexpr std::size_t kMaxBytes = FormCheck::kMaxFileBytes + std::size_t{64} * 1024;
  static Response TooLarge();

  // The folder must outlive this.
  FormBody(std::string boundary, const UploadFolder& uploads);

  std::variant<Json::Value, Response> TakeParameters() override;
  std::vector<std::string> Uploads() const override;

 private:
  bool BeginPart(const PartHead& head) override;
  bool PartData(std::string_view data) override;
  bool EndPart() override;
  std::optional<Response> Check(std::string_view piece) override;
  bool Refuse(Response response);
  bool CannotStore();

  const std::string boundary_;
  const UploadFolder& uploads_;
  FormCheck check_;
  PartHead part_;
  std::string part_text_;    // of a part that is not a file
  std::list<Upload> files_;  // while a file part is read, the last one is its file
  Json::Value parameters_{Json::objectValue};
  std::optional<Response> refusal_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_FORM_BODY_H

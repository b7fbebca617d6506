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
#include "multipart.h"
#include "upload.h"

namespace vorn::server {

// multipart/form-data. A part that is text is a parameter. A part that is a file goes to a file of
// its own as it comes; the parameter NAME_tmp is that file's path.
class FormBody : public Body, private PartReceiver {
 public:
  static constexpr std::size_t kMaxFileBytes = std::size_t{1024} * 1024;
  static constexpr std::size_t kMaxBytes = kMaxFileBytes + std::size_t{64} * 1024;  // and what is around the file
  static Response TooLarge();

  // The folder must outlive this.
  FormBody(const std::string& boundary, const UploadFolder& uploads);

  std::optional<Response> Receive(std::string_view piece) override;
  std::variant<Json::Value, Response> TakeParameters() override;
  std::vector<std::string> Uploads() const override;

 private:
  bool BeginPart(const PartHead& head) override;
  bool PartData(std::string_view data) override;
  bool EndPart() override;
  bool BeginFile(const std::string& parameter);
  bool Refuse(Response response);
  bool CannotStore();

  const UploadFolder& uploads_;
  MultipartParser parser_;
  std::size_t received_ = 0;
  PartHead part_;
  std::size_t part_bytes_ = 0;
  std::string text_;         // of the part that is text
  std::list<Upload> files_;  // the last one is the part's
  Json::Value parameters_{Json::objectValue};
  std::optional<Response> refusal_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_FORM_BODY_H

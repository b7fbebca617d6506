// How a request's body becomes parameters.
#ifndef VORN_SERVER_BODY_H
#define VORN_SERVER_BODY_H

#include <json/value.h>

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "http.h"

namespace vorn::server {

// A body and what it holds (files, for one), until the request is answered.
class Body {
 public:
  virtual ~Body() = default;

  // The next piece; a response refuses the request.
  virtual std::optional<Response> Receive(std::string_view piece) = 0;

  // The parameter object, once the body has ended, or why there is none. Called once.
  virtual std::variant<Json::Value, Response> TakeParameters() = 0;

  // The paths of the files that were uploaded, as they are in the parameters. Valid after TakeParameters().
  virtual std::vector<std::string> Uploads() const { return {}; }
};

// What the server itself adds to a parameter's name for the path of an uploaded file. No caller may
// use such a name, or it could have any file of the machine read.
constexpr std::string_view kUploadSuffix = "_tmp";
bool IsReservedName(std::string_view name);
Response ReservedName(std::string_view name);

// One JSON object, or nothing at all for an empty one.
class JsonBody : public Body {
 public:
  static constexpr std::size_t kMaxBytes = std::size_t{1024} * 1024;
  static Response TooLarge();

  std::optional<Response> Receive(std::string_view piece) override;
  std::variant<Json::Value, Response> TakeParameters() override;

 private:
  std::string text_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_BODY_H

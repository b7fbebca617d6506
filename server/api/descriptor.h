// What a module's descriptor tells the server. X.json stands beside X.so: a fragment of an
// OpenAPI 3.1 document, in which
//     "x-error-codes": {"2301": {"status": 400, "text": "..."}}
// gives the HTTP status and the administrator's text of each error code.
#ifndef VORN_SERVER_DESCRIPTOR_H
#define VORN_SERVER_DESCRIPTOR_H

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

class Descriptor {
 public:
  struct ErrorCode {
    int status;
    std::string text;
  };

  // An empty one: every code is status 500 with a plain text.
  Descriptor() = default;

  // None when `json` is no such document; `error` then says why.
  static std::optional<Descriptor> Parse(std::string_view json, std::string* error);

  ErrorCode Describe(int code) const;

 private:
  std::map<int, ErrorCode> codes_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_DESCRIPTOR_H

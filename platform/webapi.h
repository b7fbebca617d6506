// The web-API framework, as a module sees it: one request, one answer, and the port check of the
// appliance's service registry.
//
// These classes are defined by the platform library, never inline, so that a module binary runs on
// whichever platform is loaded below it.
#ifndef VORN_PLATFORM_WEBAPI_H
#define VORN_PLATFORM_WEBAPI_H

#include <json/value.h>

#include <string>

namespace VORN {

// The parameters of one request. The server makes it, a module only reads it.
class APIRequest {
 public:
  // `parameters` is the request's parameter object, or null for a request without any.
  explicit APIRequest(Json::Value parameters);
  ~APIRequest();
  APIRequest(const APIRequest&) = delete;
  APIRequest& operator=(const APIRequest&) = delete;

  // The empty name asks for the whole parameter object. Any other name asks for the member of that
  // name; `fallback` is the answer when the member (or the whole object) is absent.
  // Throws what copying a JSON value throws.
  Json::Value GetParam(const std::string& name, const Json::Value& fallback) const;

 private:
  Json::Value parameters_;
};

// The one answer to a request. A module calls SetSuccess or SetError once; the server then reads it.
class APIResponse {
 public:
  APIResponse();
  ~APIResponse();
  APIResponse(const APIResponse&) = delete;
  APIResponse& operator=(const APIResponse&) = delete;

  // Success with `data`; null stands for an answer without data.
  void SetSuccess(const Json::Value& data);

  // Failure with a non-zero error code; `details` is null where the code says it all.
  void SetError(int code, const Json::Value& details);

  // For the server.
  bool answered() const;            // SetSuccess or SetError has been called
  int error() const;                // 0 after SetSuccess
  const Json::Value& data() const;  // the data, or the details of the error

 private:
  bool answered_;
  int error_;
  Json::Value data_;
};

}  // namespace VORN

namespace WebUtils {

// Whether a port from `first` to `last` (both included) cannot be given to `service`: 0 when every
// one is free for it. A conflict is a number outside 1..65535, the configured port of another
// service, or a socket that somebody other than `service` itself listens on.
// Services are named as the appliance names them: "nfs_statd", "nfs_nlm".
int IsPortConflict(const char* service, int first, int last);

}  // namespace WebUtils

// One method of one API. A module exports an array of these that ends with a row of zeros.
// On a 32-bit target a row is 16 bytes.
struct APIRow {
  const char* api;     // "VORN.Core.FileServ.NFS"
  int version;         // 1 or 2
  const char* method;  // "get"
  void (*handler)(VORN::APIRequest* request, VORN::APIResponse* response);
};

static_assert(sizeof(APIRow) == 4 * sizeof(void*), "the row's layout is part of the binary contract");

// What every module exports as "GetAPITable": the address of its first row.
using GetAPITableFunction = const void* (*)();

#endif  // VORN_PLATFORM_WEBAPI_H

// The web-API framework that modules use: a request, its answer, the rows of an API table, and the port test of the
// appliance's service registry.
//
// The platform library defines the members of these classes, never inline: a module binary contains no layout of a
// platform and runs on every platform library. Objects are not thread-safe; each request has its own.
#ifndef VORN_PLATFORM_WEBAPI_H
#define VORN_PLATFORM_WEBAPI_H

#include <json/value.h>

#include <string>

namespace VORN {

// The parameters of one request. The server constructs and owns the object; a module only reads it.
class APIRequest {
 public:
  // `parameters` is the JSON object of the parameters, or null if the request has none.
  explicit APIRequest(Json::Value parameters);
  ~APIRequest();
  APIRequest(const APIRequest&) = delete;
  APIRequest& operator=(const APIRequest&) = delete;

  // Returns a copy of the whole parameter object if `name` is empty, and of the member `name` otherwise. Returns
  // `fallback` if the object or the member is absent. Throws std::bad_alloc, as copying a JSON value does.
  Json::Value GetParam(const std::string& name, const Json::Value& fallback) const;

 private:
  Json::Value parameters_;
};

// The answer to a request. The server constructs and owns the object. A module calls SetSuccess or SetError exactly
// once; the server then reads the answer.
class APIResponse {
 public:
  APIResponse();
  ~APIResponse();
  APIResponse(const APIResponse&) = delete;
  APIResponse& operator=(const APIResponse&) = delete;

  // Answers success with `data`. Null means no data.
  void SetSuccess(const Json::Value& data);

  // Answers failure with a non-zero error code. `details` is null if the code is sufficient.
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

// Tests whether `service` can use the ports from `first` to `last`, both included. Returns 0 if all of them are free
// for it, and a non-zero value otherwise. A port conflicts if it is outside 1 to 65535, if another service is
// configured to use it, or if a process other than `service` listens on it. Services have the appliance's names:
// "nfs_statd" for rpc.statd(8), "nfs_nlm" for the lock manager. Thread-safe.
int IsPortConflict(const char* service, int first, int last);

}  // namespace WebUtils

// A row of an API table: one method of one API. A module exports an array of rows; the row after the last one is all
// zero. On a 32-bit target a row has 16 bytes. The strings are valid as long as the module is loaded.
struct APIRow {
  const char* api;     // "VORN.Core.FileServ.NFS"
  int version;         // 1 or 2
  const char* method;  // "get"
  void (*handler)(VORN::APIRequest* request, VORN::APIResponse* response);
};

static_assert(sizeof(APIRow) == 4 * sizeof(void*), "the row's layout is part of the binary contract");

// The type of the function that every module exports under the undecorated name "GetAPITable". It returns the address
// of the first row, and null only if the module cannot be used.
using GetAPITableFunction = const void* (*)();

#endif  // VORN_PLATFORM_WEBAPI_H

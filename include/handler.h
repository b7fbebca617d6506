// What every API's handler has: the request, the response, the first error, and the one way to
// answer.
#ifndef VORN_HANDLER_H
#define VORN_HANDLER_H

#include <json/value.h>

#include <functional>

#include "webapi.h"

// Codes of the web API; their texts belong to whoever shows them.
enum ErrorCode : int {
  kNoError = 0,
  kBadParameter = 2301,     // a parameter is missing, of the wrong JSON type or not accepted
  kPlatformFailure = 2302,  // a platform operation or an allocation failed
  kPortConflict = 2303,     // a changed port belongs to another service
  kKerberosUnsupported = 2330,
  kNoKeytab = 2331,            // the uploaded file is no keytab
  kNoUpload = 2332,            // the upload names no file
  kPrincipalMapped = 2351,     // a Kerberos principal is mapped already
  kNoLocalUser = 2352,         // the local name is not that of a local user
  kPrincipalSymbol = 2353,     // the Kerberos principal contains "="
  kNoShare = 2370,             // the shared folder cannot be loaded
  kShareNotExportable = 2371,  // the shared folder holds a mount that cannot be exported
};

// Where a log line comes from: what its "%s:%d " prints.
struct CallSite {
  const char* source;  // a source file's name without its ending
  int line;
};

// Lives for one request, in the thread that serves it. Owns neither request nor response.
class ServiceHandler {
 public:
  ServiceHandler(VORN::APIRequest* request, VORN::APIResponse* response);
  ~ServiceHandler() = default;
  ServiceHandler(const ServiceHandler&) = delete;
  ServiceHandler& operator=(const ServiceHandler&) = delete;

  // Records `code` unless one is recorded: the first failure of a request is the one reported.
  void SetError(int code);

  // Each answers the request, and is called once for it. Without a recorded code, ReportError logs
  // that and answers 2302.
  void ReportError(Json::Value& details);
  void ReportError();
  void ReportSuccess(const Json::Value& data);
  void ReportSuccess();

 protected:
  using Gather = std::function<bool(Json::Value& result)>;
  using Apply = std::function<bool(const Json::Value& params)>;

  // The sequence of a method that answers with data: gather it, then answer with it or with the
  // recorded error. A failed request is logged at `site`.
  void AnswerWith(const CallSite& site, const Gather& gather);

  // The sequence of a method that changes something: apply the parameters, then answer without data
  // or with the recorded error. A failed request is logged at `site`.
  void AnswerTo(const CallSite& site, const Apply& apply);

  // Records `code`; always false, so that a step ends with `return Fail(code)`.
  bool Fail(int code);

  // The whole parameter object, read from the framework anew.
  Json::Value Parameters() const;

  static void LogRequest(const CallSite& site, const Json::Value& params);

 private:
  int error_;
  VORN::APIRequest* request_;
  VORN::APIResponse* response_;
};

#endif  // VORN_HANDLER_H

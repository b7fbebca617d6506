// The base class of all handlers: the request, the response, the first error code and the ways to answer.
#ifndef VORN_HANDLER_H
#define VORN_HANDLER_H

#include <json/value.h>

#include <functional>

#include "webapi.h"

// Error codes of the web API. The clients have the texts for them.
enum ErrorCode : int {
  kNoError = 0,
  kBadParameter = 2301,         // a parameter is missing, has the wrong JSON type or is not accepted
  kPlatformFailure = 2302,      // a platform operation or an allocation failed
  kPortConflict = 2303,         // a changed port belongs to another service
  kKerberosUnsupported = 2330,  // the platform does not support Kerberos for NFS
  kNoKeytab = 2331,             // the uploaded file is not a keytab
  kNoUpload = 2332,             // the request names no uploaded file
  kPrincipalMapped = 2351,      // a Kerberos principal is already mapped
  kNoLocalUser = 2352,          // the local name is not the name of a local user
  kPrincipalSymbol = 2353,      // the Kerberos principal contains "="
  kNoShare = 2370,              // the shared folder cannot be loaded
  kShareNotExportable = 2371,   // the shared folder contains a mount that cannot be exported
};

// The origin of a log line: the arguments of the "%s:%d " that every line begins with.
struct CallSite {
  const char* source;  // the name of a source file without its extension; static storage
  int line;
};

// Serves one request. An entry function constructs the handler on its stack, runs one driver and destroys it.
//
// Ownership: the handler owns neither the request nor the response; both must outlive it.
// Thread safety: none. Each request has its own handler, in the thread that serves the request.
// Errors: an operation that fails records an error code and returns false. Exceptions of JsonCpp and of memory
// allocation propagate through the driver to the caller; the request is then not answered.
class ServiceHandler {
 public:
  ServiceHandler(VORN::APIRequest* request, VORN::APIResponse* response);
  ~ServiceHandler() = default;
  ServiceHandler(const ServiceHandler&) = delete;
  ServiceHandler& operator=(const ServiceHandler&) = delete;

  // Records `code` if no code is recorded yet. The first failure of a request is the one that is reported.
  void SetError(int code);

  // Each of these writes the answer into the response. A driver calls exactly one of them, once.
  // ReportError answers with the recorded code; if there is none, it logs that and answers with 2302.
  // `details` and `data` are passed on as they are; the forms without a parameter pass null.
  void ReportError(Json::Value& details);
  void ReportError();
  void ReportSuccess(const Json::Value& data);
  void ReportSuccess();

 protected:
  // Fills the result and returns true, or records an error code and returns false.
  using Gather = std::function<bool(Json::Value& result)>;
  // Applies the parameters and returns true, or records an error code and returns false.
  using Apply = std::function<bool(const Json::Value& params)>;

  // Runs a method that reads: calls `gather` with a null result, then answers with the result or with the
  // recorded error. After an error it reads the parameters and logs them for `site`.
  void AnswerWith(const CallSite& site, const Gather& gather);

  // Runs a method that changes something: calls `apply` with the parameters, then answers without data or with
  // the recorded error. After an error it reads the parameters again and logs them for `site`.
  void AnswerTo(const CallSite& site, const Apply& apply);

  // Records `code` as SetError does and returns false: a failing step ends with `return Fail(code)`.
  bool Fail(int code);

  // Reads the whole parameter object from the framework. Each call makes a copy.
  Json::Value Parameters() const;

  // Logs the parameters as one line of JSON.
  static void LogRequest(const CallSite& site, const Json::Value& params);

 private:
  int error_;
  VORN::APIRequest* request_;
  VORN::APIResponse* response_;
};

#endif  // VORN_HANDLER_H

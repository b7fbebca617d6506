#include "handler.h"

#include <json/writer.h>

#include "log.h"

namespace {

constexpr char kSource[] = "handler";

// Returns the value as one line of JSON with a line feed at its end.
std::string Serialise(const Json::Value& value) {
#pragma GCC diagnostic push
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"  // the log format of requests is that of this writer
  return Json::FastWriter().write(value);
#pragma GCC diagnostic pop
}

}  // namespace

ServiceHandler::ServiceHandler(VORN::APIRequest* request, VORN::APIResponse* response)
    : error_(kNoError), request_(request), response_(response) {}

void ServiceHandler::SetError(int code) {
  if (error_ == kNoError) error_ = code;
}

bool ServiceHandler::Fail(int code) {
  SetError(code);
  return false;
}

void ServiceHandler::ReportError(Json::Value& details) {
  if (error_ == kNoError) {
    LOG_ERROR("There is no error setup");
    error_ = kPlatformFailure;
  }
  response_->SetError(error_, details);
}

void ServiceHandler::ReportError() {
  Json::Value no_details;
  ReportError(no_details);
}

void ServiceHandler::ReportSuccess(const Json::Value& data) { response_->SetSuccess(data); }

void ServiceHandler::ReportSuccess() { ReportSuccess(Json::Value()); }

void ServiceHandler::AnswerWith(const CallSite& site, const Gather& gather) {
  Json::Value result;
  if (gather(result)) return ReportSuccess(result);
  ReportError();
  LogRequest(site, Parameters());  // read again: docs/decisions/0032
}

void ServiceHandler::AnswerTo(const CallSite& site, const Apply& apply) {
  const Json::Value params = Parameters();
  if (apply(params)) return ReportSuccess();
  ReportError();
  LogRequest(site, Parameters());
}

Json::Value ServiceHandler::Parameters() const { return request_->GetParam("", Json::Value()); }

void ServiceHandler::LogRequest(const CallSite& site, const Json::Value& params) {
  LOG_ERROR_AT(site, "Request: %s", Serialise(params).c_str());
}

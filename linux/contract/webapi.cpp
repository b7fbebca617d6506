#include "webapi.h"

#include <utility>

#include "current_box.h"
#include "error.h"
#include "port_conflict.h"

namespace VORN {

APIRequest::APIRequest(Json::Value parameters) : parameters_(std::move(parameters)) {}
APIRequest::~APIRequest() = default;

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& fallback) const {
  if (name.empty()) return parameters_.isNull() ? fallback : parameters_;
  if (!parameters_.isObject()) return fallback;
  const Json::Value* member = parameters_.find(name.data(), name.data() + name.size());
  return member == nullptr ? fallback : *member;
}

APIResponse::APIResponse() : answered_(false), error_(0) {}
APIResponse::~APIResponse() = default;

void APIResponse::SetSuccess(const Json::Value& data) {
  data_ = data;
  error_ = 0;
  answered_ = true;
}

void APIResponse::SetError(int code, const Json::Value& details) {
  data_ = details;
  error_ = code;
  answered_ = true;
}

bool APIResponse::answered() const { return answered_; }
int APIResponse::error() const { return error_; }
const Json::Value& APIResponse::data() const { return data_; }

}  // namespace VORN

namespace WebUtils {

int IsPortConflict(const char* service, int first, int last) {
  const vorn::Result<bool> taken =
      vorn::IsPortTaken(vorn::CurrentBox(), service == nullptr ? "" : service, first, last);
  if (taken.ok()) return *taken ? 1 : 0;
  vorn::ToResult(taken.status());
  return 1;  // a port that could not be checked is not used
}

}  // namespace WebUtils

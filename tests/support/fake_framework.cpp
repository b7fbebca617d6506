// The web-API framework of the fake platform. It records the requested parameters and the answers.
#include <utility>

#include "fake_platform.h"

namespace VORN {

APIRequest::APIRequest(Json::Value parameters) : parameters_(std::move(parameters)) {}
APIRequest::~APIRequest() = default;

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& fallback) const {
  FakePlatform::Current().Record("GetParam", name);
  if (!name.empty()) return parameters_.get(name, fallback);
  return parameters_.isNull() ? fallback : parameters_;
}

APIResponse::APIResponse() : answered_(false), error_(0) {}
APIResponse::~APIResponse() = default;

void APIResponse::SetSuccess(const Json::Value& data) {
  FakePlatform::Current().Record("SetSuccess");
  data_ = data;
  error_ = 0;
  answered_ = true;
}

void APIResponse::SetError(int code, const Json::Value& details) {
  FakePlatform::Current().Record("SetError");
  data_ = details;
  error_ = code;
  answered_ = true;
}

bool APIResponse::answered() const { return answered_; }
int APIResponse::error() const { return error_; }
const Json::Value& APIResponse::data() const { return data_; }

}  // namespace VORN

#include "call_rights.h"

#include <algorithm>
#include <cerrno>
#include <vector>

#include "call.h"

namespace vorn {

bool HasCallContext() { return VORN::CallContext::Current() != nullptr; }

bool MayWrite() {
  const VORN::CallContext* call = VORN::CallContext::Current();
  return call == nullptr || call->description().may_write;
}

Status CheckMayWrite(const std::string& what) {
  if (MayWrite()) return {};
  return Status::Failure(EROFS, what + " is not changed by " + VORN::CallContext::Current()->description().method +
                                    ", which may only read");
}

bool IsRehearsal() {
  const VORN::CallContext* call = VORN::CallContext::Current();
  return call != nullptr && call->description().draft != nullptr;
}

bool IsUpload(const std::string& path) {
  const VORN::CallContext* call = VORN::CallContext::Current();
  if (call == nullptr) return false;
  const std::vector<std::string>& uploads = call->description().uploads;
  return std::find(uploads.begin(), uploads.end(), path) != uploads.end();
}

}  // namespace vorn

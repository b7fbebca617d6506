#include "write_access.h"

#include <cerrno>

#include "call.h"

namespace vorn {

bool MayWrite() {
  const VORN::CallContext* call = VORN::CallContext::Current();
  return call == nullptr || call->description().may_write;
}

Status CheckMayWrite(const std::string& what) {
  if (MayWrite()) return {};
  return Status::Failure(EROFS, what + " is not changed by " + VORN::CallContext::Current()->description().method +
                                    ", which may only read");
}

}  // namespace vorn

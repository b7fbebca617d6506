#include "access.h"

#include <cerrno>
#include <utility>

#include "current_box.h"
#include "error.h"
#include "explain.h"

namespace {

int FailureOf(int code) {
  if (code == ENOENT) return VORN::kAccessNoShare;
  if (code == vorn::kNoSuchUser) return VORN::kAccessNoUser;
  return code == vorn::kNoSuchGroup ? VORN::kAccessNoGroup : VORN::kAccessFailed;
}

}  // namespace

namespace VORN {

int ExplainAccess(const AccessQuestion& question, AccessAnswer* answer) {
  vorn::Result<AccessAnswer> explained =
      vorn::ExplainAccess(vorn::CurrentBox(), vorn::NameService::OfSystem(), question);
  if (vorn::ToResult(explained.status()) != 0) return FailureOf(explained.status().code());
  *answer = std::move(*explained);
  return 0;
}

}  // namespace VORN

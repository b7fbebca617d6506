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
  std::vector<AccessAnswer> answers;
  const int explained = ExplainAccesses(question, {question.share}, &answers);
  if (explained == 0) *answer = std::move(answers.front());
  return explained;
}

int ExplainAccesses(const AccessQuestion& question, const std::vector<std::string>& shares,
                    std::vector<AccessAnswer>* answers) {
  vorn::Result<std::vector<AccessAnswer>> explained =
      vorn::ExplainAccesses(vorn::CurrentBox(), vorn::NameService::OfSystem(), question, shares);
  if (vorn::ToResult(explained.status()) != 0) return FailureOf(explained.status().code());
  *answers = std::move(*explained);
  return 0;
}

}  // namespace VORN

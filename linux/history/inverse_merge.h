// Takes a change back while later changes stay.
#ifndef VORN_LINUX_HISTORY_INVERSE_MERGE_H
#define VORN_LINUX_HISTORY_INVERSE_MERGE_H

#include <optional>
#include <string>

#include "status.h"

namespace vorn {

// The result of taking back a change of a file.
struct InverseMerge {
  bool conflicts = false;              // whether later changes touch the same lines
  std::string conflict;                // those lines, marked as by git-merge-file(1)
  std::optional<std::string> content;  // without a conflict: the file without the change; nullopt: it is removed
};

// Takes the change from `before` to `after` out of the file that contains `now`; nullopt stands for a missing file. A
// three-way merge by lines. Fails if the library fails.
Result<InverseMerge> MergeInverse(const std::optional<std::string>& before, const std::optional<std::string>& after,
                                  const std::optional<std::string>& now);

}  // namespace vorn

#endif  // VORN_LINUX_HISTORY_INVERSE_MERGE_H

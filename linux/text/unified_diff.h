// The difference between two versions of a file.
#ifndef VORN_LINUX_TEXT_UNIFIED_DIFF_H
#define VORN_LINUX_TEXT_UNIFIED_DIFF_H

#include <optional>
#include <string>
#include <string_view>

namespace vorn {

// Returns the difference in the unified format of diff(1), with `context` unchanged lines around each change; patch(1)
// makes `after` of `before` with it. nullopt is a file that does not exist ("/dev/null"). Empty if there is no
// difference.
//
// The number of lines is the smallest possible one (Myers, "An O(ND) Difference Algorithm and Its Variations", 1986)
// for versions with up to 1,000 differing lines between the first and the last difference. Versions that differ in more
// lines are shown as one change, so that the time is bounded by the size of the texts.
std::string UnifiedDiff(const std::string& path, std::optional<std::string_view> before,
                        std::optional<std::string_view> after, int context = 3);

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_UNIFIED_DIFF_H

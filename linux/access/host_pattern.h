// Patterns of host names in export rules.
#ifndef VORN_LINUX_ACCESS_HOST_PATTERN_H
#define VORN_LINUX_ACCESS_HOST_PATTERN_H

#include <string>

namespace vorn {

// Whether a host name matches a pattern of exports(5), as rpc.mountd(8) compares them, which differs from fnmatch(3):
// only "^" negates a set, and "!" is an ordinary character of it; the ranges of a set do not ignore case, everything
// else does. Takes a time that is at most proportional to the product of the lengths.
bool MatchesHostPattern(const std::string& name, const std::string& pattern);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_HOST_PATTERN_H

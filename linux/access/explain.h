// Explains what a client may do in a share, and why.
#ifndef VORN_LINUX_ACCESS_EXPLAIN_H
#define VORN_LINUX_ACCESS_EXPLAIN_H

#include <string>
#include <vector>

#include "access.h"
#include "box.h"
#include "host_names.h"
#include "status.h"

namespace vorn {

// Answers the question for each of the shares, in their order. Fails with ENOENT if there is no such share, and with
// kNoSuchUser or kNoSuchGroup. The caller owns no lock, because the name service may take its time.
Result<std::vector<VORN::AccessAnswer>> ExplainAccesses(Box& box, const NameService& names,
                                                        const VORN::AccessQuestion& question,
                                                        const std::vector<std::string>& shares);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_EXPLAIN_H

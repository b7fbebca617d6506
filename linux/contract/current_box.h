// Which box the contract's functions work on.
#ifndef VORN_LINUX_CONTRACT_CURRENT_BOX_H
#define VORN_LINUX_CONTRACT_CURRENT_BOX_H

#include "box.h"

namespace vorn {

class History;

// The box on which this thread works: the draft of its call context (call.h), else RealBox().
Box& CurrentBox();

// The box of this process's root directory (Root::Current). There is one object per root; it lives as long as the
// process. May be called from any thread.
Box& RealBox();

// The history of RealBox().
History& RealHistory();

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_CURRENT_BOX_H

// Taking a change of the history back.
#ifndef VORN_LINUX_CONTRACT_UNDO_H
#define VORN_LINUX_CONTRACT_UNDO_H

#include <string>
#include <vector>

#include "box.h"
#include "change_history.h"
#include "status.h"

namespace vorn {

// The outcome of UndoChange (platform/history.h), as its result.
struct Undone {
  int result = 0;
  std::vector<Status> reasons;     // of a result other than 0
  std::vector<std::string> files;  // that were changed
};

// Takes the change back in `box`, which may be a draft. The calling thread owns the configuration lock.
Undone Undo(Box& box, History& history, const std::string& id);

}  // namespace vorn

#endif  // VORN_LINUX_CONTRACT_UNDO_H

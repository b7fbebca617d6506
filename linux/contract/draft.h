// The inside of VORN::Draft (rehearsal.h).
#ifndef VORN_LINUX_CONTRACT_DRAFT_H
#define VORN_LINUX_CONTRACT_DRAFT_H

#include <memory>
#include <vector>

#include "box.h"
#include "draft_store.h"
#include "engine.h"
#include "rehearsal.h"

// `store` and `engine` belong to `box` or are used by it.
struct VORN::Draft::State {
  explicit State(vorn::Box& real);

  std::vector<vorn::RehearsedAction> actions;
  vorn::DraftStore* store;
  std::unique_ptr<vorn::Engine> engine;
  vorn::Box box;
};

#endif  // VORN_LINUX_CONTRACT_DRAFT_H

#include "rehearsal.h"

#include <algorithm>
#include <set>
#include <utility>

#include "action_effect.h"
#include "box_paths.h"
#include "current_box.h"
#include "draft.h"
#include "engines.h"
#include "exports_files.h"
#include "find_faults.h"
#include "keytab.h"
#include "keytab_file.h"
#include "rule_changes.h"
#include "touched_clients.h"
#include "unicode.h"
#include "unified_diff.h"

namespace vorn {
namespace {

using ChangedFile = DraftStore::ChangedFile;

VORN::Rehearsal::File Describe(const ChangedFile& file, int context) {
  std::optional<std::string> before = file.before;
  std::optional<std::string> after = file.after;
  for (std::optional<std::string>* content : {&before, &after}) {
    if (*content) *content = WithoutKeys(file.path, **content);
  }
  return {ToValidUtf8(file.path), ToValidUtf8(UnifiedDiff(file.path, before, after, context))};
}

const char* NameOf(RightChange::Access access) {
  if (access == RightChange::Access::kLess) return "less";
  return access == RightChange::Access::kMore ? "more" : "other";
}

std::vector<VORN::Rehearsal::Rule::Change> Describe(const std::vector<RightChange>& rights) {
  std::vector<VORN::Rehearsal::Rule::Change> changes;
  changes.reserve(rights.size());
  for (const RightChange& right : rights) {
    changes.push_back({right.change, NameOf(right.access), right.flavor, right.text});
  }
  return changes;
}

// Files that cannot be read have no rules: the call has then failed for the same reason.
std::vector<RuleChange> CompareExports(Box& box, const ChangedFile& own) {
  const Result<std::vector<SharedExportsFile>> files = OpenAllExports(box);
  if (!files.ok()) return {};
  std::vector<const ExportsDocument*> others;
  for (auto file = files->begin() + 1; file != files->end(); ++file) others.push_back(&(*file)->document);
  const ExportsDocument before(own.before.value_or(""));
  const ExportsDocument& after = files->front()->document;
  return CompareRules(before, after, others, BoxPaths(box.root()));
}

// Adds the changed rules, and the clients that they touch. Clients that cannot be listed are left out: what the call
// would do does not depend on them; the report then says that it does not have all.
void AddRules(Box& real, Box& draft, const ChangedFile& own, VORN::Rehearsal* report) {
  std::set<std::string> directories;
  for (const RuleChange& rule : CompareExports(draft, own)) {
    directories.insert(rule.directory);
    report->rules.push_back({ToValidUtf8(rule.directory), ToValidUtf8(rule.client), Describe(rule.rights)});
  }
  if (directories.empty()) return;
  const Result<TouchedClients> touched = FindTouchedClients(real, draft, directories);
  if (!touched.ok()) {
    report->has_all_clients = false;
    return;
  }
  report->has_all_clients = touched->is_complete;
  for (const TouchedClient& one : touched->clients) {
    report->clients.push_back({one.address, one.name, one.version, one.path, Describe(one.rights), one.is_certain});
  }
}

}  // namespace
}  // namespace vorn

VORN::Draft::State::State(vorn::Box& real)
    : store(new vorn::DraftStore(real.store())),
      box(
          real.root(), std::unique_ptr<vorn::Store>(store),
          [this, &real](vorn::Box& draft) -> vorn::Result<vorn::Engine*> {
            const auto chosen = [&real] { return real.engine(); };
            if (const vorn::Result<vorn::Engine*> of_box = chosen(); !of_box.ok()) return of_box.status();
            if (this->engine == nullptr) this->engine = vorn::MakeDraftEngine(draft, chosen);
            return this->engine.get();
          },
          &actions) {}

namespace VORN {

// The draft is one of the real box, also where a call context with another draft is current.
Draft::Draft() : state_(std::make_unique<State>(vorn::RealBox())) {}
Draft::~Draft() = default;

Draft::State& Draft::state() const { return *state_; }

Rehearsal Draft::Report(int context) const {
  Rehearsal report;
  for (const vorn::ChangedFile& file : state_->store->Changes()) {
    report.files.push_back(vorn::Describe(file, context));
    if (file.path == vorn::kExportsFile) vorn::AddRules(vorn::RealBox(), state_->box, file, &report);
  }
  for (const vorn::RehearsedAction action : state_->actions) {
    vorn::ActionEffect effect = vorn::EffectOf(action, state_->box);
    report.actions.push_back({effect.action, effect.clients, effect.grace_seconds, std::move(effect.effect)});
  }
  return report;
}

Rehearsal::Findings Draft::CompareFindings() const {
  if (state_->store->Changes().empty()) return {};
  const HealthReport before = vorn::FindFaultsOfFiles(vorn::RealBox());
  const HealthReport after = vorn::FindFaultsOfFiles(state_->box);
  return {vorn::FindAdded(before.findings, after.findings), vorn::FindAdded(after.findings, before.findings)};
}

}  // namespace VORN

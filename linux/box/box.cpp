#include "box.h"

#include <mutex>

#include "call.h"
#include "call_rights.h"
#include "configuration_lock.h"

namespace vorn {

Box::Box(Root root, std::unique_ptr<Store> store, EngineChooser choose_engine)
    : Box(std::move(root), std::move(store), std::move(choose_engine), nullptr) {}

Box::Box(Root root, std::unique_ptr<Store> store, EngineChooser choose_engine, std::vector<RehearsedAction>* actions)
    : root_(std::move(root)), store_(std::move(store)), choose_engine_(std::move(choose_engine)), actions_(actions) {}

bool Box::Rehearse(RehearsedAction action) {
  if (actions_ == nullptr) return false;
  actions_->push_back(action);
  return true;
}

Result<StoredFile> Box::Read(const std::string& path) {
  Result<StoredFile> file = store_->Read(path);
  if (file.ok()) FirstReads::Note(*this, path, file->version);
  return file;
}

Result<std::shared_ptr<const StoredFolder>> Box::List(const std::string& folder) {
  const Result<Version> version = store_->VersionOf(folder);
  if (!version.ok()) return version.status();
  const KeyView key{folder, typeid(StoredFolder)};
  const Cached known = Find(key);
  if (known.IsOf(*version)) return std::static_pointer_cast<const StoredFolder>(known.document);
  Result<StoredFolder> listed = store_->List(folder);
  if (!listed.ok()) return listed.status();
  auto document = std::make_shared<const StoredFolder>(std::move(*listed));
  Keep(key, {document->version, document->is_settled, document});
  return document;
}

Result<Box::Document> Box::LoadAny(std::type_index type, const std::string& path,
                                   const std::function<Result<Document>(StoredFile, const void*)>& parse) {
  const Result<Version> version = store_->VersionOf(path);
  if (!version.ok()) return version.status();
  const KeyView key{path, type};
  const Cached known = Find(key);
  if (known.IsOf(*version)) {
    FirstReads::Note(*this, path, *version);
    return known.document;
  }
  Result<StoredFile> file = Read(path);
  if (!file.ok()) return file.status();
  const Version read = file->version;
  const bool is_settled = file->is_settled;
  Result<Document> document = parse(std::move(*file), known.document.get());
  if (document.ok()) Keep(key, {read, is_settled, *document});
  return document;
}

Box::Cached Box::Find(const KeyView& key) {
  const std::shared_lock lock(mutex_);
  const auto found = documents_.find(key);
  return found != documents_.end() ? found->second : Cached{};
}

void Box::Keep(const KeyView& key, Cached document) {
  const std::lock_guard lock(mutex_);
  documents_.insert_or_assign(Key{std::string(key.name), key.type}, std::move(document));
}

std::shared_ptr<const Box::Derived> Box::LastDerived(const KeyView& key) {
  const std::shared_lock lock(mutex_);
  const auto found = derived_.find(key);
  return found != derived_.end() ? found->second : nullptr;
}

// The document is made in a call context of its own, which has the warnings about it and no others.
Result<Box::Document> Box::MakeDerived(const KeyView& key, Sources sources,
                                       const std::function<Result<Document>()>& make) {
  Derived derived{std::move(sources), nullptr, {}};
  const auto make_with_warnings = [&] {
    const VORN::CallContext* const call = VORN::CallContext::Current();
    const VORN::CallContext making(call == nullptr ? VORN::CallDescription() : call->description());
    Result<Document> document = make();
    derived.warnings = making.warnings();
    return document;
  };
  Result<Document> document = make_with_warnings();
  AddWarnings(derived);
  if (!document.ok()) return document;
  derived.document = *document;
  auto kept = std::make_shared<const Derived>(std::move(derived));
  const std::lock_guard lock(mutex_);
  derived_.insert_or_assign(Key{std::string(key.name), key.type}, std::move(kept));
  return document;
}

void Box::AddWarnings(const Derived& derived) {
  VORN::CallContext* const call = VORN::CallContext::Current();
  if (call == nullptr) return;
  for (const std::string& warning : derived.warnings) call->AddWarning(warning);
}

Status Box::Replace(const std::string& path, std::string_view text, const Version& expected, unsigned mode) {
  return Change(path, text, expected, [&] { return store_->Replace(path, text, expected, mode); });
}

Status Box::Remove(const std::string& path, const Version& expected) {
  return Change(path, std::nullopt, expected, [&]() -> Result<Version> {
    Status status = store_->Remove(path, expected);
    return status.ok() ? Result<Version>(Version{}) : status;
  });
}

// Replaces the file with `text`, or removes it if there is none. `write` does so and returns the new version.
Status Box::Change(const std::string& path, std::optional<std::string_view> text, const Version& expected,
                   const std::function<Result<Version>()>& write) {
  if (Status status = CheckMayWrite(path); !status.ok()) return status;
  if (Status status = FirstReads::Check(*this, path, expected); !status.ok()) return status;
  if (recorder_ != nullptr) recorder_->Intend(path, text);
  const Result<Version> written = write();
  if (recorder_ != nullptr) recorder_->Settle(path, written.status());
  if (written.ok()) FirstReads::Renew(*this, path, *written);
  return written.status();
}

void Box::NoteAction(const std::string& action, const Status& status) {
  if (recorder_ == nullptr || !recorder_->IsOn()) return;
  const ConfigurationLock lock(*this);
  if (lock.status().ok()) recorder_->NoteAction(action, status);
}

Status Box::Confirm(const std::string& path) {
  const Status status = CheckMayWrite(path);
  return status.ok() ? store_->Confirm(path) : status;
}

// The mode is a part of a file's version. A context that has read the file must not take the new version for a change
// by somebody else.
Status Box::SetMode(const std::string& path, unsigned mode) {
  if (Status status = CheckMayWrite(path); !status.ok()) return status;
  const Result<Version> before = store_->VersionOf(path);
  if (!before.ok()) return before.status();
  if (Status status = FirstReads::Check(*this, path, *before); !status.ok()) return status;
  if (Status status = store_->SetMode(path, mode); !status.ok()) return status;
  const Result<Version> after = store_->VersionOf(path);
  if (after.ok()) FirstReads::Renew(*this, path, *after);
  return after.status();
}

bool Box::Exists(const std::string& path) const {
  const Result<Version> version = store_->VersionOf(path);
  return version.ok() && version->exists;
}

Result<std::unique_ptr<HeldLock>> Box::Lock(const std::string& name, std::chrono::milliseconds limit) {
  return store_->Lock(name, limit);
}

}  // namespace vorn

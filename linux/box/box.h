// The box that an operation works on.
#ifndef VORN_LINUX_BOX_BOX_H
#define VORN_LINUX_BOX_BOX_H

#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <shared_mutex>
#include <string>
#include <string_view>
#include <typeindex>
#include <utility>
#include <vector>

#include "change_recorder.h"
#include "engine.h"
#include "rehearsed_action.h"
#include "root.h"
#include "store.h"

namespace vorn {

// One box: its files, its service, its configuration lock. Objects may be used by several threads at once
// and live as long as any thread uses them.
//
// Reading takes no lock. A parsed document is immutable, shared by its readers, and parsed again only
// when the file has another version. Within a configuration context (see configuration_lock.h) the version
// that is read first is remembered per path, and a write of a file with any other version is refused.
//
// Every operation that changes the box is refused with EROFS in a call that may not write (call.h).
class Box {
 public:
  // Returns the engine that the box's settings ask for; it lives as long as the function.
  using EngineChooser = std::function<Result<Engine*>(Box&)>;

  Box(Root root, std::unique_ptr<Store> store, EngineChooser choose_engine);

  // A draft of a box, for a rehearsal: its store is a DraftStore, and its engine one that records actions. `actions`
  // receives what is not done; it must outlive the box.
  Box(Root root, std::unique_ptr<Store> store, EngineChooser choose_engine, std::vector<RehearsedAction>* actions);

  const Root& root() const { return root_; }
  const Store& store() const { return *store_; }

  // Records the changes of the box from now on. Called before the box is used.
  void RecordChanges(std::unique_ptr<ChangeRecorder> recorder) { recorder_ = std::move(recorder); }

  // The recorder of the box's changes; null if they are not recorded, as in a draft.
  ChangeRecorder* recorder() const { return recorder_.get(); }

  // Records that the service operation `action` was attempted.
  void NoteAction(const std::string& action, const Status& status);

  bool is_draft() const { return actions_ != nullptr; }

  // In a draft: records the action and returns true; the caller must not take it. Otherwise returns false. Whatever
  // changes something outside of the store asks this first.
  bool Rehearse(RehearsedAction action);

  // The engine that the box's settings ask for. It lives as long as the box.
  Result<Engine*> engine() { return choose_engine_(*this); }

  Result<StoredFile> Read(const std::string& path);
  Result<std::shared_ptr<const StoredFolder>> List(const std::string& folder);

  // The document of type T that `parse` makes of the file at `path`.
  template <typename T>
  Result<std::shared_ptr<const T>> Load(const std::string& path,
                                        const std::function<Result<T>(StoredFile file)>& parse) {
    return LoadAfter<T>(path, [&parse](StoredFile file, const T* /*previous*/) { return parse(std::move(file)); });
  }

  // Like Load, for a document that is made faster with another version of it at hand. `previous` is the document
  // that was made last, or nullptr.
  template <typename T>
  Result<std::shared_ptr<const T>> LoadAfter(
      const std::string& path, const std::function<Result<T>(StoredFile file, const T* previous)>& parse) {
    const auto parse_any = [&](StoredFile file, const void* previous) -> Result<std::shared_ptr<const void>> {
      Result<T> document = parse(std::move(file), static_cast<const T*>(previous));
      if (!document.ok()) return document.status();
      return std::shared_ptr<const void>(std::make_shared<const T>(std::move(*document)));
    };
    Result<std::shared_ptr<const void>> document = LoadAny(typeid(T), path, parse_any);
    if (!document.ok()) return document.status();
    return std::static_pointer_cast<const T>(std::move(*document));
  }

  // The document of type T that `make` makes of several documents. It is shared and made again when `sources` has
  // other objects. `name` distinguishes documents of one type. Each call that gets the document has the warnings
  // (call.h) of the call that made it.
  template <typename T>
  Result<std::shared_ptr<const T>> Derive(const std::string& name, std::vector<std::shared_ptr<const void>> sources,
                                          const std::function<Result<T>()>& make) {
    const std::shared_ptr<const Derived> last = LastDerived({name, typeid(T)});
    if (last != nullptr && last->sources == sources) return SharedAs<T>(*last);
    return DeriveAnew<T>(name, std::move(sources), make);
  }

  // Like Derive, for a document that knows what it was made of: the one made last is shared while `is_current` says so.
  template <typename T>
  Result<std::shared_ptr<const T>> DeriveWhile(const std::string& name,
                                               const std::function<bool(const T& previous)>& is_current,
                                               const std::function<Result<T>()>& make) {
    const std::shared_ptr<const Derived> last = LastDerived({name, typeid(T)});
    if (last != nullptr && is_current(*static_cast<const T*>(last->document.get()))) return SharedAs<T>(*last);
    return DeriveAnew<T>(name, {}, make);
  }

  // These change a file as Store says. The calling thread owns the configuration lock.
  Status Replace(const std::string& path, std::string_view text, const Version& expected, unsigned mode = 0644);
  Status Remove(const std::string& path, const Version& expected);
  Status Confirm(const std::string& path);
  Status SetMode(const std::string& path, unsigned mode);

  // Whether there is a file or folder at `path`.
  bool Exists(const std::string& path) const;

  // Takes a lock of the box.
  Result<std::unique_ptr<HeldLock>> Lock(const std::string& name, std::chrono::milliseconds limit);

 private:
  Status Change(const std::string& path, std::optional<std::string_view> text, const Version& expected,
                const std::function<Result<Version>()>& write);

  using Document = std::shared_ptr<const void>;
  using Sources = std::vector<std::shared_ptr<const void>>;
  struct Cached {
    Version version;
    bool is_settled = false;  // whether any later change of the file gives another version
    Document document;

    bool IsOf(const Version& current) const { return is_settled && document != nullptr && version == current; }
  };
  struct Derived {
    Sources sources;
    Document document;
    std::vector<std::string> warnings;
  };

  // The name of a document, which is a path for most, and its type.
  struct KeyView {
    std::string_view name;
    std::type_index type;
  };
  struct Key {
    std::string name;
    std::type_index type;
  };
  // An order in which most keys differ in the length of their names.
  struct KeyOrder {
    using is_transparent = void;
    template <typename One, typename Other>
    bool operator()(const One& a, const Other& b) const {
      if (a.name.size() != b.name.size()) return a.name.size() < b.name.size();
      const int order = a.name.compare(b.name);
      return order != 0 ? order < 0 : a.type < b.type;
    }
  };

  Result<Document> LoadAny(std::type_index type, const std::string& path,
                           const std::function<Result<Document>(StoredFile file, const void* previous)>& parse);
  Cached Find(const KeyView& key);
  void Keep(const KeyView& key, Cached document);
  std::shared_ptr<const Derived> LastDerived(const KeyView& key);
  Result<Document> MakeDerived(const KeyView& key, Sources sources, const std::function<Result<Document>()>& make);
  static void AddWarnings(const Derived& derived);

  template <typename T>
  static std::shared_ptr<const T> SharedAs(const Derived& derived) {
    AddWarnings(derived);
    return std::static_pointer_cast<const T>(derived.document);
  }

  template <typename T>
  Result<std::shared_ptr<const T>> DeriveAnew(const std::string& name, Sources&& sources,
                                              const std::function<Result<T>()>& make) {
    const auto make_any = [&make]() -> Result<Document> {
      Result<T> document = make();
      if (!document.ok()) return document.status();
      return Document(std::make_shared<const T>(std::move(*document)));
    };
    Result<Document> made = MakeDerived({name, typeid(T)}, std::move(sources), make_any);
    if (!made.ok()) return made.status();
    return std::static_pointer_cast<const T>(std::move(*made));
  }

  const Root root_;
  const std::unique_ptr<Store> store_;
  std::unique_ptr<ChangeRecorder> recorder_;
  const EngineChooser choose_engine_;
  std::vector<RehearsedAction>* const actions_;  // null: this is no draft
  std::shared_mutex mutex_;
  std::map<Key, Cached, KeyOrder> documents_;
  std::map<Key, std::shared_ptr<const Derived>, KeyOrder> derived_;
};

}  // namespace vorn

#endif  // VORN_LINUX_BOX_BOX_H

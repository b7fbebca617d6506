#include "history_repository.h"

#include <fcntl.h>
#include <git2.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <set>
#include <utility>
#include <vector>

#include "file_descriptor.h"
#include "files.h"
#include "owned.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

constexpr char kBranch[] = "refs/heads/main";
constexpr std::size_t kMostPacks = 16;
constexpr std::size_t kIdSize = 40;

using Odb = Owned<git_odb, git_odb_free>;
using Tree = Owned<git_tree, git_tree_free>;
using Blob = Owned<git_blob, git_blob_free>;
using CommitObject = Owned<git_commit, git_commit_free>;
using Entry = Owned<git_tree_entry, git_tree_entry_free>;
using Signature = Owned<git_signature, git_signature_free>;
using Reference = Owned<git_reference, git_reference_free>;
using PackBuilder = Owned<git_packbuilder, git_packbuilder_free>;

// The failure of the last function of libgit2 on this thread.
Status GitFailure(int result, const std::string& what, const char* file = __builtin_FILE(),
                  int line = __builtin_LINE()) {
  const git_error* error = git_error_last();
  const std::string reason = error == nullptr ? "libgit2 failed with " + std::to_string(result) : error->message;
  return Status::Failure(result == GIT_ENOTFOUND ? ENOENT : EIO, what + ": " + reason, file, line);
}

// The configuration files of the account that runs this program, and the owner of the folder, have no influence.
void Initialize() {
  static const int initialized = [] {
    const int result = git_libgit2_init();
    for (const git_config_level_t level :
         {GIT_CONFIG_LEVEL_PROGRAMDATA, GIT_CONFIG_LEVEL_SYSTEM, GIT_CONFIG_LEVEL_XDG, GIT_CONFIG_LEVEL_GLOBAL}) {
      git_libgit2_opts(GIT_OPT_SET_SEARCH_PATH, level, "");
    }
    git_libgit2_opts(GIT_OPT_SET_OWNER_VALIDATION, 0);
    git_libgit2_opts(GIT_OPT_SET_CACHE_MAX_SIZE, ssize_t{4} << 20);  // all repositories together; bytes
    return result;
  }();
  static_cast<void>(initialized);
}

std::string Text(const git_oid& id) {
  std::string text(kIdSize, '0');
  git_oid_fmt(text.data(), &id);
  return text;
}

Result<git_oid> IdFrom(const std::string& text) {
  git_oid id{};
  if (text.size() == kIdSize && git_oid_fromstr(&id, text.c_str()) == 0) return id;
  return Status::Failure(ENOENT, "\"" + text + "\" is no change of the history");
}

Result<CommitObject> Find(git_repository* repository, const std::string& text) {
  const Result<git_oid> id = IdFrom(text);
  if (!id.ok()) return id.status();
  git_commit* commit = nullptr;
  if (int result = git_commit_lookup(&commit, repository, &*id); result < 0) return GitFailure(result, text);
  return CommitObject(commit);
}

Result<Tree> TreeOf(git_repository* repository, const std::string& commit_id) {
  const Result<CommitObject> commit = Find(repository, commit_id);
  if (!commit.ok()) return commit.status();
  git_tree* tree = nullptr;
  if (int result = git_commit_tree(&tree, commit->get()); result < 0) return GitFailure(result, commit_id);
  return Tree(tree);
}

// Null if the tree has no such file.
Entry EntryAt(const Tree& tree, const std::string& path) {
  git_tree_entry* entry = nullptr;
  git_tree_entry_bypath(&entry, tree.get(), path.c_str() + 1);
  return Entry(entry);
}

Result<git_oid> WriteBlob(git_repository* repository, const std::string& content) {
  git_oid id{};
  if (int r = git_blob_create_from_buffer(&id, repository, content.data(), content.size()); r < 0) {
    return GitFailure(r, "a file of the history");
  }
  return id;
}

// Writes the tree that `files` make of `base`, which may be null.
Result<Tree> WriteTree(git_repository* repository, const Tree& base, const HistoryRepository::Files& files) {
  std::vector<git_tree_update> updates;
  for (const auto& [path, content] : files) {
    git_tree_update update{};
    update.path = path.c_str() + 1;
    update.action = content ? GIT_TREE_UPDATE_UPSERT : GIT_TREE_UPDATE_REMOVE;
    update.filemode = GIT_FILEMODE_BLOB;
    if (!content && (base == nullptr || EntryAt(base, path) == nullptr)) continue;
    if (content) {
      const Result<git_oid> blob = WriteBlob(repository, *content);
      if (!blob.ok()) return blob.status();
      update.id = *blob;
    }
    updates.push_back(update);
  }
  git_oid id{};
  if (int r = git_tree_create_updated(&id, repository, base.get(), updates.size(), updates.data()); r < 0) {
    return GitFailure(r, "a tree of the history");
  }
  git_tree* tree = nullptr;
  if (int r = git_tree_lookup(&tree, repository, &id); r < 0) return GitFailure(r, "a tree of the history");
  return Tree(tree);
}

// git separates the parts of a signature by these.
std::string SignaturePart(std::string text) {
  for (char& c : text) {
    if (c == '<' || c == '>' || static_cast<unsigned char>(c) < ' ') c = '?';
  }
  return text.empty() ? "unknown" : text;
}

Status SyncPath(const fs::path& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  if (!file || fsync(file.get()) != 0) return Status::System(errno, path.string());
  return {};
}

std::set<fs::path> FilesIn(const fs::path& folder) {
  std::error_code ignored;
  std::set<fs::path> files;
  for (const fs::directory_entry& entry : fs::directory_iterator(folder, ignored)) files.insert(entry.path());
  return files;
}

Status SyncFileSystemOf(const std::string& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!file || syncfs(file.get()) != 0) return Status::System(errno, path);
  return {};
}

// Creates the repository under another name, so that a whole one appears or none.
Status Create(const std::string& location) {
  const std::string draft = location + ".new";
  std::error_code ignored;
  fs::remove_all(draft, ignored);
  if (Status status = MakeFolders(fs::path(location).parent_path()); !status.ok()) return status;
  git_repository_init_options options;
  git_repository_init_options_init(&options, GIT_REPOSITORY_INIT_OPTIONS_VERSION);
  options.flags = GIT_REPOSITORY_INIT_BARE | GIT_REPOSITORY_INIT_MKDIR;
  options.initial_head = "main";
  options.description = "The configuration of this box. Each commit is a change.";
  git_repository* repository = nullptr;
  const int result = git_repository_init_ext(&repository, draft.c_str(), &options);
  git_repository_free(repository);
  if (result < 0) return GitFailure(result, draft);
  if (chmod(draft.c_str(), 0700) != 0) return Status::System(errno, draft);
  if (Status status = SyncFileSystemOf(draft); !status.ok()) return status;
  if (rename(draft.c_str(), location.c_str()) != 0) return Status::System(errno, location);
  return SyncPath(fs::path(location).parent_path());
}

}  // namespace

void HistoryRepository::Close::operator()(git_repository* repository) const { git_repository_free(repository); }

Result<HistoryRepository> HistoryRepository::Open(const std::string& location, bool create) {
  Initialize();
  git_repository* repository = nullptr;
  int result = git_repository_open_bare(&repository, location.c_str());
  if (result == GIT_ENOTFOUND && create) {
    if (Status status = Create(location); !status.ok()) return status;
    result = git_repository_open_bare(&repository, location.c_str());
  }
  if (result < 0) return GitFailure(result, location);
  return HistoryRepository(location, repository);
}

HistoryRepository::HistoryRepository(std::string location, git_repository* repository)
    : location_(std::move(location)), repository_(repository) {
  const Result<FileText> shallow = ReadFileOrNothing(location_ + "/shallow");
  if (shallow.ok()) oldest_ = shallow->text.substr(0, kIdSize);
}

Result<std::string> HistoryRepository::Tip() const {
  git_oid id{};
  const int result = git_reference_name_to_id(&id, repository_.get(), kBranch);
  if (result == GIT_ENOTFOUND) return std::string();
  if (result < 0) return GitFailure(result, location_);
  return Text(id);
}

Result<HistoryRepository::Commit> HistoryRepository::Read(const std::string& id) const {
  const Result<CommitObject> commit = Find(repository_.get(), id);
  if (!commit.ok()) return commit.status();
  const git_oid* parent = git_commit_parent_id(commit->get(), 0);
  const bool is_cut = id == oldest_;
  return Commit{id, parent == nullptr || is_cut ? "" : Text(*parent), is_cut, git_commit_time(commit->get()),
                git_commit_message(commit->get())};
}

Result<HistoryRepository::Content> HistoryRepository::ContentAt(const std::string& commit,
                                                                const std::string& path) const {
  if (commit.empty()) return Content();
  const Result<Tree> tree = TreeOf(repository_.get(), commit);
  if (!tree.ok()) return tree.status();
  const Entry entry = EntryAt(*tree, path);
  if (entry == nullptr) return Content();
  git_blob* found = nullptr;
  if (int result = git_blob_lookup(&found, repository_.get(), git_tree_entry_id(entry.get())); result < 0) {
    return GitFailure(result, path);
  }
  const Blob blob(found);
  return Content(std::string(static_cast<const char*>(git_blob_rawcontent(found)),
                             static_cast<std::size_t>(git_blob_rawsize(found))));
}

bool HistoryRepository::Has(const std::string& commit, const std::string& path, const Content& content) const {
  if (commit.empty()) return !content;
  const Result<Tree> tree = TreeOf(repository_.get(), commit);
  if (!tree.ok()) return false;
  const Entry entry = EntryAt(*tree, path);
  if (entry == nullptr || !content) return entry == nullptr && !content;
  git_oid id{};
  git_odb_hash(&id, content->data(), content->size(), GIT_OBJECT_BLOB);
  return git_oid_equal(&id, git_tree_entry_id(entry.get())) != 0;
}

Result<std::vector<std::string>> HistoryRepository::Paths(const std::string& commit) const {
  std::vector<std::string> paths;
  if (commit.empty()) return paths;
  const Result<Tree> tree = TreeOf(repository_.get(), commit);
  if (!tree.ok()) return tree.status();
  const auto add = [](const char* folder, const git_tree_entry* entry, void* list) {
    if (git_tree_entry_type(entry) == GIT_OBJECT_BLOB) {
      static_cast<std::vector<std::string>*>(list)->push_back("/" + std::string(folder) + git_tree_entry_name(entry));
    }
    return 0;
  };
  if (int r = git_tree_walk(tree->get(), GIT_TREEWALK_PRE, add, &paths); r < 0) return GitFailure(r, commit);
  return paths;
}

Result<std::string> HistoryRepository::Add(const NewCommit& commit) {
  const Result<std::string> tip = Tip();
  if (!tip.ok()) return tip.status();
  CommitObject parent;
  Tree base;
  if (!tip->empty()) {
    Result<CommitObject> found = Find(repository_.get(), *tip);
    if (!found.ok()) return found.status();
    parent = std::move(*found);
    Result<Tree> tree = TreeOf(repository_.get(), *tip);
    if (!tree.ok()) return tree.status();
    base = std::move(*tree);
  }
  const Result<Tree> tree = WriteTree(repository_.get(), base, commit.files);
  if (!tree.ok()) return tree.status();
  git_signature* made = nullptr;
  const int signed_result = git_signature_new(&made, SignaturePart(commit.author).c_str(),
                                              SignaturePart(commit.origin).c_str(), commit.time, 0);
  if (signed_result < 0) return GitFailure(signed_result, "the author of a change");
  const Signature signature(made);
  const git_commit* parents[] = {parent.get()};
  git_oid id{};
  const int result = git_commit_create(&id, repository_.get(), nullptr, made, made, "UTF-8", commit.message.c_str(),
                                       tree->get(), parent == nullptr ? 0 : 1, parents);
  return result < 0 ? GitFailure(result, location_) : SetTip(Text(id));
}

Result<std::string> HistoryRepository::SetTip(const std::string& id) {
  const Result<git_oid> oid = IdFrom(id);
  if (!oid.ok()) return oid.status();
  // A writer that was killed leaves the lock file of the branch; there is no other writer now.
  unlink((location_ + "/" + kBranch + ".lock").c_str());
  git_reference* reference = nullptr;
  const int result = git_reference_create(&reference, repository_.get(), kBranch, &*oid, 1, nullptr);
  const Reference owned(reference);
  if (result < 0) return GitFailure(result, location_);
  return id;
}

Status HistoryRepository::Walk(const std::function<bool(const Commit&)>& visit) const {
  Result<std::string> id = Tip();
  if (!id.ok()) return id.status();
  while (!id->empty()) {
    Result<Commit> commit = Read(*id);
    if (!commit.ok()) return commit.status();
    if (!visit(*commit)) return {};
    *id = std::move(commit->parent);
  }
  return {};
}

// Writes a pack of the newest commits for which `is_wanted` is true, with everything in them. `last` is the oldest of
// them, if there is any.
Status HistoryRepository::PackFrom(const std::function<bool(const Commit&)>& is_wanted, Commit* last) {
  git_packbuilder* made = nullptr;
  if (int r = git_packbuilder_new(&made, repository_.get()); r < 0) return GitFailure(r, location_);
  const PackBuilder pack(made);
  int result = 0;
  Status walked = Walk([&](const Commit& commit) {
    if (!is_wanted(commit)) return false;
    *last = commit;
    const Result<git_oid> id = IdFrom(commit.id);
    result = git_packbuilder_insert_commit(made, &*id);
    return result >= 0;
  });
  if (!walked.ok()) return walked;
  if (result >= 0 && git_packbuilder_object_count(made) > 0) {
    result = git_packbuilder_write(made, nullptr, 0600, nullptr, nullptr);
  }
  return result < 0 ? GitFailure(result, location_) : SyncPacks();
}

Status HistoryRepository::SyncPacks() const {
  const fs::path folder = fs::path(location_) / "objects/pack";
  for (const fs::path& file : FilesIn(folder)) {
    if (Status status = SyncPath(file); !status.ok()) return status;
  }
  return SyncPath(folder);
}

Status HistoryRepository::Pack(const std::string& since, std::size_t most) {
  std::size_t packs = 0;
  for (const fs::path& file : FilesIn(fs::path(location_) / "objects/pack"))
    packs += file.extension() == ".pack" ? 1 : 0;
  Commit last;
  Status status = packs >= kMostPacks ? Consolidate(most)
                                      : PackFrom([&](const Commit& commit) { return commit.id != since; }, &last);
  if (status.ok()) RemoveLooseObjects();
  return status;
}

// The new pack is durable before the branch is cut, and the branch is cut before the old packs are removed.
Status HistoryRepository::Consolidate(std::size_t most) {
  const fs::path folder = fs::path(location_) / "objects/pack";
  const std::set<fs::path> old = FilesIn(folder);
  std::size_t count = 0;
  Commit last;
  if (Status status = PackFrom([&](const Commit&) { return count++ < most; }, &last); !status.ok()) return status;
  if (!last.parent.empty()) {
    const std::string shallow = location_ + "/shallow";
    const Result<FileStamp> stamp = StampOfFile(shallow);
    if (!stamp.ok()) return stamp.status();
    const Result<FileStamp> written = ReplaceFile(shallow, last.id + "\n", *stamp);
    if (!written.ok()) return written.status();
    oldest_ = last.id;
  }
  const std::set<fs::path> all = FilesIn(folder);
  if (all.size() <= old.size()) return {};  // the pack has the name of an old one
  std::error_code ignored;
  for (const fs::path& file : old) fs::remove(file, ignored);
  return {};
}

Status HistoryRepository::Reset(const std::string& tip) {
  RemoveLooseObjects();
  if (!tip.empty()) return SetTip(tip).status();
  git_reference_remove(repository_.get(), kBranch);
  return {};
}

void HistoryRepository::RemoveLooseObjects() const {
  std::error_code ignored;
  for (const fs::path& folder : FilesIn(fs::path(location_) / "objects")) {
    if (folder.filename().string().size() == 2) fs::remove_all(folder, ignored);
  }
}

}  // namespace vorn

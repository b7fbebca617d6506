#include "ini_files.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <filesystem>
#include <functional>
#include <set>
#include <utility>

#include "ascii.h"
#include "configuration_lock.h"
#include "nfs_utils.h"
#include "notice.h"

namespace vorn {
namespace {

constexpr std::size_t kMostSources = 1000;
constexpr char kEnvironment[] = "environment";

// The names in the folder that are read.
bool IsConfigurationFile(std::string_view name) {
  constexpr std::string_view kEnding = ".conf";
  return name.front() != '.' && name.size() > kEnding.size() && name.substr(name.size() - kEnding.size()) == kEnding;
}

// The names in a folder that are read, in their order, and a version that stands for this list.
struct ReadNames {
  std::vector<std::string> names;
  Version version;
};

ReadNames NamesOf(const StoredFolder& folder) {
  ReadNames read;
  std::copy_if(folder.names.begin(), folder.names.end(), std::back_inserter(read.names), IsConfigurationFile);
  std::string text;
  for (const std::string& name : read.names) text += name + "\n";
  read.version.exists = true;
  read.version.state = {read.names.size(), text.size(), std::hash<std::string>()(text), 0, 0};
  return read;
}

Result<std::shared_ptr<const ReadNames>> NamesIn(Box& box, const std::string& folder) {
  const Result<std::shared_ptr<const StoredFolder>> listed = box.List(folder);
  if (!listed.ok()) return listed.status();
  return box.Derive<ReadNames>(folder, {*listed}, [&] { return Result<ReadNames>(NamesOf(**listed)); });
}

// The path under which the list of a folder's names is remembered.
std::string ListPath(const std::string& folder) { return folder + "/*.conf"; }

// Inserts a name in the order of the readers, unless it is there.
void Insert(std::string name, std::vector<std::string>* names) {
  const auto place =
      std::lower_bound(names->begin(), names->end(), name,
                       [](const std::string& a, const std::string& b) { return strverscmp(a.c_str(), b.c_str()) < 0; });
  if (place == names->end() || *place != name) names->insert(place, std::move(name));
}

// The path in an include line: relative to the folder of the file, and optional if it begins with a hyphen.
std::string IncludedPath(const std::string& including, std::string_view file) {
  if (!file.empty() && file.front() == '-') file.remove_prefix(1);
  if (!file.empty() && file.front() == '/') return std::string(file);
  return including.substr(0, including.rfind('/') + 1) + std::string(file);
}

// The readers skip what they cannot open.
bool IsSkipped(int code) {
  return code == EINVAL || code == ENOTDIR || code == ELOOP || code == ENAMETOOLONG || code == EACCES || code == ENXIO;
}

// The path without "." and "..", to compare it with others.
std::string NormalPath(const std::string& path) { return std::filesystem::path(path).lexically_normal(); }

// A setting and its place among all files.
struct Placed {
  IniFound found;
  std::vector<int> position;
  bool is_hidden;
};

std::vector<int> PositionOf(const std::vector<int>& source, int line) {
  std::vector<int> position = source;
  position.push_back(line);
  return position;
}

}  // namespace

std::string IniFound::Where() const { return file->location() + ":" + std::to_string(line); }

Result<SharedIniFiles> IniFiles::Open(Box& box, const std::string& path, const std::optional<Draft>& draft) {
  if (draft) {
    Result<IniFiles> read = Read(box, path, draft);
    return read.ok() ? Result<SharedIniFiles>(std::make_shared<const IniFiles>(std::move(*read))) : read.status();
  }
  const auto is_current = [&box](const IniFiles& previous) { return previous.IsCurrent(box); };
  Result<SharedIniFiles> files =
      box.DeriveWhile<IniFiles>(path, is_current, [&] { return Read(box, path, std::nullopt); });
  if (!files.ok()) return files;
  const Status& readable = (*files)->CheckReadable();
  if (!readable.ok()) NoticeOnce(path, (*files)->sources_.front().file->version(), readable.reason());
  return files;
}

Result<IniFiles> IniFiles::Read(Box& box, const std::string& path, const std::optional<Draft>& draft) {
  IniFiles files;
  if (Status status = files.AddAll(box, path, draft); !status.ok()) return status;
  if (files.readable_.ok()) files.CheckReferences();
  return files;
}

// Unchanged files have unchanged includes, so that no other files are read than before.
bool IniFiles::IsCurrent(Box& box) const {
  if (!has_all_) return false;
  const Result<std::shared_ptr<const ReadNames>> names = NamesIn(box, folder_);
  if (!names.ok() || (*names)->version != names_) return false;
  FirstReads::Note(box, ListPath(folder_), names_);
  return std::all_of(sources_.begin(), sources_.end(), [&box](const Source& source) {
    const Result<SharedIniFile> file = IniFile::Open(box, source.path);
    return file.ok() && *file == source.file;
  });
}

Status IniFiles::AddAll(Box& box, const std::string& path, const std::optional<Draft>& draft) {
  folder_ = path + ".d";
  const Result<std::shared_ptr<const ReadNames>> read = NamesIn(box, folder_);
  if (!read.ok()) return read.status();
  names_ = (*read)->version;
  FirstReads::Note(box, ListPath(folder_), names_);
  std::vector<std::string> names = (*read)->names;
  const bool is_new = draft && draft->path.compare(0, folder_.size() + 1, folder_ + "/") == 0;
  if (is_new) Insert(draft->path.substr(folder_.size() + 1), &names);
  if (Status status = Add(box, {path, nullptr, std::nullopt, {0}}, draft); !status.ok()) return status;
  for (const std::string& name : names) {
    Source source{folder_ + "/", nullptr, std::nullopt, {static_cast<int>(sources_.size()) + 1}};
    source.path += name;
    if (Status status = Add(box, std::move(source), draft); !status.ok()) return status;
  }
  return {};
}

// Two paths can have the same normal form and be different files, because ".." follows symbolic links.
bool IniFiles::Opened::Has(const Source& other) const {
  const std::string path = NormalPath(other.path);
  for (const Opened* opened = this; opened != nullptr; opened = opened->including) {
    const Source& own = opened->source;
    const bool is_same_file = own.file->version() == other.file->version() && NormalPath(own.path) == path;
    if (is_same_file && own.inherited == other.inherited) return true;
  }
  return false;
}

Status IniFiles::Add(Box& box, Source source, const std::optional<Draft>& draft, const Opened* including) {
  if (draft && draft->path == NormalPath(source.path)) {
    const std::string below = box.root().is_box() ? "" : box.root().directory();
    source.file = IniFile::FromText(below + source.path, draft->text);
  } else {
    Result<SharedIniFile> file = IniFile::Open(box, source.path);
    const bool is_main = sources_.empty();
    if (!file.ok()) {
      has_all_ = false;
      return is_main || !IsSkipped(file.status().code()) ? file.status() : Status();
    }
    source.file = std::move(*file);
  }
  if (including != nullptr && including->Has(source)) {
    Reject(source, including, "the file includes itself, and the programs of nfs-utils read it until they crash");
    return {};
  }
  if (sources_.size() >= kMostSources) {
    Reject(source, including, "more than " + std::to_string(kMostSources) + " files are included");
    return {};
  }
  sources_.push_back(std::move(source));
  return AddIncludes(box, {sources_.back(), including}, draft);
}

void IniFiles::Reject(const Source& source, const Opened* including, const std::string& why) {
  has_all_ = false;
  if (!readable_.ok()) return;
  const std::string where = including == nullptr
                                ? source.file->location()
                                : including->source.file->location() + ":" + std::to_string(source.position.back());
  readable_ = Status::Failure(kSyntax, where + ": " + why);
}

Status IniFiles::AddIncludes(Box& box, const Opened& opened, const std::optional<Draft>& draft) {
  const Source& source = opened.source;
  for (const IniInclude& include : source.file->document().Includes()) {
    std::optional<Inherited> section = source.inherited;
    if (include.section != IniDocument::kInherited) section = Inherited{include.section, include.has_argument};
    if (!section) continue;
    Source included{IncludedPath(source.path, include.file), nullptr, section,
                    PositionOf(source.position, include.line)};
    if (Status status = Add(box, std::move(included), draft, &opened); !status.ok()) return status;
  }
  return {};
}

bool IniFiles::Inherits(const Source& source, std::string_view section) {
  if (!source.inherited || (source.inherited->has_argument && !kArgumentsHideValues)) return false;
  return source.inherited->name == LowerAscii(section);
}

std::optional<IniFound> IniFiles::FindStored(std::string_view section, std::string_view key) const {
  std::optional<Placed> last;
  const auto consider = [&](const Source& source, std::string_view name, bool has_argument) {
    const std::optional<IniSetting> setting = source.file->document().FindLast(name, key);
    if (!setting) return;
    std::vector<int> position = PositionOf(source.position, setting->line);
    if (last && position < last->position) return;
    last = Placed{{setting->key, setting->value, setting->value, source.file.get(), setting->line},
                  position,
                  has_argument || setting->is_hidden};
  };
  for (const Source& source : sources_) {
    consider(source, section, false);
    if (Inherits(source, section)) consider(source, IniDocument::kInherited, source.inherited->has_argument);
  }
  if (!last || last->is_hidden) return std::nullopt;
  return last->found;
}

IniFiles::Resolved IniFiles::Resolve(std::string_view value) const {
  if (value.empty() || value.front() != '$') return {value};
  std::set<std::string> passed;
  while (!value.empty() && value.front() == '$') {
    if (!passed.insert(LowerAscii(value)).second) return {std::nullopt, true};
    const std::optional<IniFound> variable = FindStored(kEnvironment, value.substr(1));
    if (!variable) return {};
    value = variable->stored;
  }
  return {value};
}

// A variable that no value outside of [environment] refers to is never read.
void IniFiles::CheckReferences() {
  for (const Source& source : sources_) {
    for (const IniReference& reference : source.file->document().References()) {
      const bool is_inherited = reference.section == IniDocument::kInherited;
      if (is_inherited && !source.inherited) continue;
      const std::string section = is_inherited ? source.inherited->name : reference.section;
      const std::optional<IniFound> found = FindStored(section, reference.key);
      if (section == kEnvironment || !found || !Resolve(found->stored).is_circular) continue;
      readable_ = Status::Failure(kSyntax, found->Where() + ": the value of " + std::string(found->key) +
                                               " refers to itself, and the programs of nfs-utils follow it forever");
      return;
    }
  }
}

std::optional<IniFound> IniFiles::Find(std::string_view section, std::string_view key) const {
  std::optional<IniFound> found = FindStored(section, key);
  if (!found) return std::nullopt;
  const std::optional<std::string_view> value = Resolve(found->stored).value;
  if (!value) return std::nullopt;
  found->value = *value;
  return found;
}

std::vector<IniFound> IniFiles::Settings(std::string_view section) const {
  std::vector<IniFound> settings;
  int contributing = 0;
  for (const Source& source : sources_) {
    const auto add = [&](std::string_view name) {
      const IniDocument& document = source.file->document();
      contributing += document.HasSection(name) ? 1 : 0;
      settings.reserve(settings.size() + document.SettingsAtMost());
      document.VisitSettings(name, [&](const IniSetting& s) {
        settings.push_back({s.key, s.value, s.value, source.file.get(), s.line});
      });
    };
    if (Inherits(source, section)) {
      contributing += source.inherited->has_argument ? 1 : 0;  // its lines only hide others
      add(IniDocument::kInherited);
    }
    add(section);
  }
  std::set<std::string> seen;  // a file that is included twice gives a key twice
  const auto is_in_force = [&](const IniFound& setting) {
    if (contributing <= 1) return true;
    const std::optional<IniFound> deciding = FindStored(section, setting.key);
    if (!deciding || deciding->file != setting.file || deciding->line != setting.line) return false;
    return seen.insert(LowerAscii(setting.key)).second;
  };
  auto end = settings.begin();
  for (const IniFound& setting : settings) {
    const std::optional<std::string_view> value = Resolve(setting.stored).value;
    if (!value || !is_in_force(setting)) continue;
    if (&*end != &setting) *end = setting;
    end->value = *value;
    ++end;
  }
  settings.erase(end, settings.end());
  return settings;
}

std::vector<const IniFile*> IniFiles::files() const {
  std::vector<const IniFile*> files;
  files.reserve(sources_.size());
  for (const Source& source : sources_) files.push_back(source.file.get());
  return files;
}

std::vector<std::shared_ptr<const void>> IniFiles::sources() const {
  std::vector<std::shared_ptr<const void>> files;
  files.reserve(sources_.size());
  for (const Source& source : sources_) files.push_back(source.file);
  return files;
}

Status IniFiles::CheckUnchanged(Box& box) const {
  if (Status status = FirstReads::Check(box, ListPath(folder_), names_); !status.ok()) return status;
  for (const Source& source : sources_) {
    if (Status status = FirstReads::Check(box, source.path, source.file->version()); !status.ok()) return status;
  }
  return {};
}

Status IniFiles::NoteOwnWrite(Box& box, const std::string& path) {
  const std::string folder = path.substr(0, path.rfind('/'));
  const Result<std::shared_ptr<const ReadNames>> names = NamesIn(box, folder);
  if (names.ok()) FirstReads::Renew(box, ListPath(folder), (*names)->version);
  return names.status();
}

}  // namespace vorn

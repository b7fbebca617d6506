#include "krb5_profile.h"

extern "C" {
#include <com_err.h>  // says nothing of C++ itself
}
#include <profile.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <filesystem>
#include <vector>

#include "files.h"
#include "lines.h"
#include "memory_file.h"
#include "owned.h"
#include "root.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

constexpr int kDeepestInclude = 10;  // the library's own limit
constexpr char kSpace[] = " \t\r\n\v\f";

std::string_view Trimmed(std::string_view line) {
  line.remove_prefix(std::min(line.find_first_not_of(kSpace), line.size()));
  return line.substr(0, line.find_last_not_of(kSpace) + 1);
}

// The path behind `word`, when the line is that directive.
std::string_view PathAfter(std::string_view word, std::string_view line) {
  if (line.substr(0, word.size()) != word) return {};
  const std::string_view rest = line.substr(word.size());
  return rest.find_first_of(kSpace) == 0 ? Trimmed(rest) : std::string_view();
}

// The names that "includedir" of krb5.conf(5) reads.
bool IsIncluded(const std::string& name) {
  if (name.empty() || name.front() == '.') return false;
  const bool plain = std::all_of(name.begin(), name.end(),
                                 [](unsigned char c) { return std::isalnum(c) != 0 || c == '-' || c == '_'; });
  return plain || fs::path(name).extension() == ".conf";
}

// Combines a file and its includes into one text. The library itself would look for includes below "/" instead of
// below the root. An included file starts and ends outside of every section, so the surrounding section is opened
// again after it; within braces the file is postponed until they are closed.
class Flattener {
 public:
  explicit Flattener(const Root& root) : root_(root) {}

  // Adds a file and what it includes; `path` is one of this system.
  Status Add(const std::string& path) {
    if (++depth_ > kDeepestInclude) return Status::Failure(kSyntax, path + " is included too deep");
    const Result<FileText> file = ReadFile(path);
    if (!file.ok()) return file.status();
    Status status = AddText(file->text);
    --depth_;
    return status;
  }

  const std::string& text() const { return text_; }

 private:
  struct Open {
    std::string section;
    int braces = 0;
    std::vector<std::string> postponed;
  };

  Status AddText(std::string_view text) {
    Open open;
    for (const std::string_view line : LinesOf(text)) {
      if (Status status = AddLine(Trimmed(line), &open); !status.ok()) return status;
    }
    return {};
  }

  Status AddLine(std::string_view line, Open* open) {
    const std::string_view file = PathAfter("include", line);
    const std::string_view folder = PathAfter("includedir", line);
    if (!file.empty()) return Include({std::string(file)}, open);
    if (!folder.empty()) return IncludeFolder(std::string(folder), open);
    if (!PathAfter("module", line).empty()) return {};  // a plug-in of the library has no values
    text_.append(line).append("\n");
    if (line.empty() || line.front() == '#' || line.front() == ';') return {};
    if (line.front() == '[' && open->braces == 0) open->section = line;
    if (line.back() == '{') ++open->braces;
    if (line.front() == '}') --open->braces;
    return open->braces > 0 ? Status() : Include(std::exchange(open->postponed, {}), open);
  }

  Status Include(const std::vector<std::string>& paths, Open* open) {
    for (const std::string& path : paths) {
      if (open->braces > 0) {
        open->postponed.push_back(path);
        continue;
      }
      const Result<std::string> place = root_.Locate(path);
      if (!place.ok()) return place.status();
      if (Status status = Add(*place); !status.ok()) return status;
      text_.append(open->section).append("\n");
    }
    return {};
  }

  Status IncludeFolder(const std::string& path, Open* open) {
    const Result<std::string> place = root_.Locate(path);
    if (!place.ok()) return place.status();
    std::vector<std::string> paths;
    std::error_code error;
    for (const fs::directory_entry& entry : fs::directory_iterator(*place, error)) {
      const std::string name = entry.path().filename();
      if (IsIncluded(name)) paths.push_back((fs::path(path) / name).string());
    }
    if (error) return Status::System(error.value(), *place);
    std::sort(paths.begin(), paths.end());
    return Include(paths, open);
  }

  const Root& root_;
  std::string text_;
  int depth_ = 0;
};

Status Failure(long code, const std::string& path) {
  return Status::Failure(kSyntax, path + ": " + error_message(code));
}

}  // namespace

Result<std::optional<std::string>> GetKrb5Value(const Root& root, const std::string& path, const std::string& section,
                                                const std::string& key) {
  const Result<std::string> location = root.Locate(path);
  if (!location.ok()) return location.status();
  Flattener flat(root);
  if (Status status = flat.Add(*location); !status.ok()) return status;
  const Result<FileDescriptor> file = MakeMemoryFile("krb5.conf", flat.text());
  if (!file.ok()) return file.status();

  profile_t opened = nullptr;
  if (const long code = profile_init_path(PathOf(*file).c_str(), &opened); code != 0) return Failure(code, *location);
  const Owned<struct _profile_t, profile_release> profile(opened);
  char* found = nullptr;
  const long code = profile_get_string(profile.get(), section.c_str(), key.c_str(), nullptr, nullptr, &found);
  if (code != 0) return Failure(code, *location);
  const Owned<char, profile_release_string> value(found);
  if (value == nullptr) return std::optional<std::string>();
  return std::optional<std::string>(value.get());
}

}  // namespace vorn

#include "krb5_profile.h"

extern "C" {
#include <com_err.h>  // says nothing of C++ itself
}
#include <profile.h>
#include <sys/mman.h>
#include <unistd.h>

#include <algorithm>
#include <cctype>
#include <cerrno>
#include <filesystem>
#include <memory>
#include <vector>

#include "file_descriptor.h"
#include "files.h"
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

// As krb5.conf(5) says which files of a folder count.
bool IsIncluded(const std::string& name) {
  if (name.empty() || name.front() == '.') return false;
  const bool plain = std::all_of(name.begin(), name.end(),
                                 [](unsigned char c) { return std::isalnum(c) != 0 || c == '-' || c == '_'; });
  return plain || fs::path(name).extension() == ".conf";
}

// One text out of a file and what it includes. The library would look for includes below "/"; here
// the root is another. An included file starts and ends outside of every section: the one around it
// is opened again, and where braces are open the file comes after they are closed.
class Flattener {
 public:
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
    while (!text.empty()) {
      const std::string_view line = text.substr(0, text.find('\n'));
      text.remove_prefix(std::min(line.size() + 1, text.size()));
      if (Status status = AddLine(Trimmed(line), &open); !status.ok()) return status;
    }
    return {};
  }

  Status AddLine(std::string_view line, Open* open) {
    const std::string_view file = PathAfter("include", line);
    const std::string_view folder = PathAfter("includedir", line);
    if (!file.empty()) return Include({std::string(file)}, open);
    if (!folder.empty()) return IncludeFolder(std::string(folder), open);
    if (!PathAfter("module", line).empty()) return {};  // code of the box's own, which has no value here
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
      const Result<std::string> place = Root::Current().Locate(path);
      if (!place.ok()) return place.status();
      if (Status status = Add(*place); !status.ok()) return status;
      text_.append(open->section).append("\n");
    }
    return {};
  }

  Status IncludeFolder(const std::string& path, Open* open) {
    const Result<std::string> place = Root::Current().Locate(path);
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

  std::string text_;
  int depth_ = 0;
};

Status Failure(long code, const std::string& path) {
  return Status::Failure(kSyntax, path + ": " + error_message(code));
}

// The library reads files only.
Result<FileDescriptor> InMemory(const std::string& text) {
  FileDescriptor file(memfd_create("krb5.conf", MFD_CLOEXEC));
  if (!file) return Status::System(errno, "a file in memory");
  if (write(file.get(), text.data(), text.size()) != static_cast<ssize_t>(text.size())) {
    return Status::System(errno, "a file in memory");
  }
  return file;
}

struct Release {
  void operator()(profile_t profile) const { profile_release(profile); }
  void operator()(char* text) const { profile_release_string(text); }
};

}  // namespace

Result<std::optional<std::string>> GetKrb5Value(const std::string& path, const std::string& section,
                                                const std::string& key) {
  Flattener flat;
  if (Status status = flat.Add(path); !status.ok()) return status;
  const Result<FileDescriptor> file = InMemory(flat.text());
  if (!file.ok()) return file.status();

  profile_t opened = nullptr;
  const std::string place = "/proc/self/fd/" + std::to_string(file->get());
  if (const long code = profile_init_path(place.c_str(), &opened); code != 0) return Failure(code, path);
  const std::unique_ptr<struct _profile_t, Release> profile(opened);
  char* found = nullptr;
  const long code = profile_get_string(profile.get(), section.c_str(), key.c_str(), nullptr, nullptr, &found);
  if (code != 0) return Failure(code, path);
  const std::unique_ptr<char, Release> value(found);
  if (value == nullptr) return std::optional<std::string>();
  return std::optional<std::string>(value.get());
}

}  // namespace vorn

#include "runtime_folder.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <utility>

namespace vorn::server {
namespace {

struct FreeText {
  void operator()(char* text) const { std::free(text); }
};

// Opens the folder `name` of `parent`, and creates it if it is missing. Follows links. Empty with errno set on failure.
std::string MakeFolder(const std::string& parent, const char* name) {
  std::string path = parent == "/" ? "" : parent;
  path.append("/").append(name);
  if (mkdir(path.c_str(), 0755) != 0 && errno != EEXIST) return "";
  const std::unique_ptr<char, FreeText> canonical(realpath(path.c_str(), nullptr));
  return canonical ? canonical.get() : "";
}

bool IsBelow(const std::string& path, const std::string& root) {
  return root == "/" || (path.compare(0, root.size(), root) == 0 && path[root.size()] == '/');
}

}  // namespace

std::optional<std::string> MakeFolders(const std::string& root, std::initializer_list<const char*> names,
                                       std::string* error) {
  std::string path = root;
  for (const char* name : names) {
    const std::string parent = std::exchange(path, MakeFolder(path, name));
    if (path.empty()) {
      *error = parent + ": " + name + " cannot be made: " + std::strerror(errno);
      return std::nullopt;
    }
    if (!IsBelow(path, root)) {
      *error = path;
      error->append(" is outside of the root ").append(root);
      return std::nullopt;
    }
  }
  return path;
}

RuntimeFolder::RuntimeFolder(std::string path, UniqueFd folder) : path_(std::move(path)), folder_(std::move(folder)) {}

std::optional<RuntimeFolder> RuntimeFolder::Claim(const std::string& root, std::string* error) {
  const std::optional<std::string> made = MakeFolders(root, {"run", "vorn"}, error);
  if (!made) return std::nullopt;
  const std::string& path = *made;
  UniqueFd folder(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (folder && flock(folder.get(), LOCK_EX | LOCK_NB) == 0) return RuntimeFolder(path, std::move(folder));
  *error = path + ": " + (errno == EWOULDBLOCK ? "another vornd serves this root" : std::strerror(errno));
  return std::nullopt;
}

}  // namespace vorn::server

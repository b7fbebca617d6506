// Relations of absolute paths. All paths are normal: they have no "//", no "/./", no "/../", and no slash at the end
// except for "/" itself. Nothing is asked of a file system.
#ifndef VORN_LINUX_TEXT_FOLDER_PATH_H
#define VORN_LINUX_TEXT_FOLDER_PATH_H

#include <algorithm>
#include <string>
#include <string_view>
#include <vector>

namespace vorn {

// Whether `path` is below `folder`, at any depth. A folder is not below itself.
inline bool IsBelow(std::string_view path, std::string_view folder) {
  if (folder == "/") return path != "/";
  return path.size() > folder.size() && path[folder.size()] == '/' && path.substr(0, folder.size()) == folder;
}

inline bool IsAtOrBelow(std::string_view path, std::string_view folder) {
  return path == folder || IsBelow(path, folder);
}

// Returns the folders from "/" to `path`, which is the last one.
inline std::vector<std::string> WayTo(const std::string& path) {
  std::vector<std::string> way = {"/"};
  for (std::size_t end = 1; end < path.size();) {
    end = std::min(path.find('/', end + 1), path.size());
    way.push_back(path.substr(0, end));
  }
  return way;
}

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_FOLDER_PATH_H

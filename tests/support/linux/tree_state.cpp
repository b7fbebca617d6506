#include "tree_state.h"

#include <sys/stat.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <stdexcept>

namespace fs = std::filesystem;

namespace {

std::string StateOf(const std::string& path) {
  struct stat info {};
  if (lstat(path.c_str(), &info) != 0) throw std::runtime_error("cannot look at " + path);
  std::ostringstream text;
  text << std::oct << info.st_mode << std::dec << " " << info.st_uid << ":" << info.st_gid << " " << info.st_ino << " "
       << info.st_nlink << " " << info.st_size << " " << info.st_mtim.tv_sec << "." << info.st_mtim.tv_nsec << " "
       << info.st_ctim.tv_sec << "." << info.st_ctim.tv_nsec << "\n";
  if (S_ISREG(info.st_mode)) {
    std::ifstream file(path);
    text << std::string(std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>());
  }
  if (S_ISLNK(info.st_mode)) text << fs::read_symlink(path).native();
  return text.str();
}

}  // namespace

TreeState StateOfTree(const std::string& folder) {
  TreeState state{{folder, StateOf(folder)}};
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(folder)) {
    state[entry.path().native()] = StateOf(entry.path().native());
  }
  return state;
}

// The state of everything below a folder, to prove that something changed nothing.
#ifndef VORN_TESTS_SUPPORT_LINUX_TREE_STATE_H
#define VORN_TESTS_SUPPORT_LINUX_TREE_STATE_H

#include <map>
#include <string>

// Each path below the folder, and the folder itself, with type, mode, owner, inode, size, mtime, ctime and content.
// Only the time of the last access is left out.
using TreeState = std::map<std::string, std::string>;
TreeState StateOfTree(const std::string& folder);

#endif  // VORN_TESTS_SUPPORT_LINUX_TREE_STATE_H

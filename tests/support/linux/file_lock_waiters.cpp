#include "file_lock_waiters.h"

#include <sys/stat.h>

#include <fstream>

// Reads /proc/locks: proc(5).
bool HasLockWaiter(const std::string& path) {
  struct stat file {};
  if (stat(path.c_str(), &file) != 0) return false;
  std::ifstream locks("/proc/locks");
  for (std::string line; std::getline(locks, line);) {
    const bool waits = line.find("-> FLOCK") != std::string::npos;
    if (waits && line.find(":" + std::to_string(file.st_ino) + " ") != std::string::npos) return true;
  }
  return false;
}

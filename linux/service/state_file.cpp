#include "state_file.h"

#include "configuration_lock.h"

namespace vorn {

Status StoreState(Box& box, const std::string& path, const std::string& text) {
  const ConfigurationLock lock(box);
  if (!lock.status().ok()) return lock.status();
  const Result<StoredFile> before = box.Read(path);
  if (!before.ok()) return before.status();
  return before->text == text ? Status() : box.Replace(path, text, before->version);
}

}  // namespace vorn

#include "extended_attributes.h"

#include <sys/xattr.h>

#include <cerrno>
#include <cstring>
#include <vector>

namespace vorn {
namespace {

// The result of a call that reports the size it needs: flistxattr(2), fgetxattr(2).
template <typename Call>
Result<std::vector<char>> ReadAll(const Call& call, const std::string& what) {
  for (;;) {
    const ssize_t needed = call(nullptr, 0);
    if (needed < 0) return Status::System(errno, what);
    std::vector<char> buffer(static_cast<std::size_t>(needed));
    const ssize_t size = call(buffer.data(), buffer.size());
    if (size < 0 && errno == ERANGE) continue;  // it has grown meanwhile
    if (size < 0) return Status::System(errno, what);
    buffer.resize(static_cast<std::size_t>(size));
    return buffer;
  }
}

Status CopyAttribute(int from, int to, const char* attribute, const std::string& name) {
  const std::string what = name + ": the extended attribute " + attribute;
  const auto value =
      ReadAll([&](void* buffer, std::size_t size) { return fgetxattr(from, attribute, buffer, size); }, what);
  if (!value.ok()) return value.status();
  if (fsetxattr(to, attribute, value->data(), value->size(), 0) != 0) return Status::System(errno, what);
  return {};
}

// Whether the file `to` has the attribute with the same value already, as a new file has its folder's label.
bool HasSameAttribute(int from, int to, const char* attribute) {
  const auto read = [&](int file) {
    return ReadAll([&](void* buffer, std::size_t size) { return fgetxattr(file, attribute, buffer, size); }, "");
  };
  const auto wanted = read(from);
  const auto present = read(to);
  return wanted.ok() && present.ok() && *wanted == *present;
}

}  // namespace

Status CopyExtendedAttributes(const FileDescriptor& from, const FileDescriptor& to, const std::string& name) {
  const auto names =
      ReadAll([&](char* buffer, std::size_t size) { return flistxattr(from.get(), buffer, size); }, name);
  if (!names.ok() && names.status().code() == EOPNOTSUPP) return {};
  if (!names.ok()) return names.status();
  const char* const end = names->data() + names->size();
  for (const char* attribute = names->data(); attribute < end; attribute += std::strlen(attribute) + 1) {
    if (HasSameAttribute(from.get(), to.get(), attribute)) continue;
    if (Status status = CopyAttribute(from.get(), to.get(), attribute, name); !status.ok()) return status;
  }
  return {};
}

}  // namespace vorn

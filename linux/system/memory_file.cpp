#include "memory_file.h"

#include <sys/mman.h>

#include <cerrno>

#include "files.h"

namespace vorn {

Result<FileDescriptor> MakeMemoryFile(const char* name, std::string_view content) {
  FileDescriptor file(memfd_create(name, MFD_CLOEXEC));
  if (!file) return Status::System(errno, std::string("memfd_create ") + name);
  if (Status status = WriteAll(file.get(), content, name); !status.ok()) return status;
  return file;
}

std::string PathOf(const FileDescriptor& file) { return "/proc/self/fd/" + std::to_string(file.get()); }

}  // namespace vorn

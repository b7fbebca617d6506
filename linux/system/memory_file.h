// A file without a name, for libraries that read files only.
#ifndef VORN_LINUX_SYSTEM_MEMORY_FILE_H
#define VORN_LINUX_SYSTEM_MEMORY_FILE_H

#include <string>
#include <string_view>

#include "file_descriptor.h"
#include "status.h"

namespace vorn {

// A file in memory (memfd_create(2)) that contains `content`. `name` is only seen in /proc.
Result<FileDescriptor> MakeMemoryFile(const char* name, std::string_view content);

// A path under which this process can open the file, as long as the descriptor is open.
std::string PathOf(const FileDescriptor& file);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_MEMORY_FILE_H

// Extended attributes of files: xattr(7). Access control lists and security labels are among them.
#ifndef VORN_LINUX_SYSTEM_EXTENDED_ATTRIBUTES_H
#define VORN_LINUX_SYSTEM_EXTENDED_ATTRIBUTES_H

#include <string>

#include "file_descriptor.h"
#include "status.h"

namespace vorn {

// Gives the open file `to` every extended attribute of the open file `from` that this process can see. A file system
// without extended attributes has none to copy. Fails if one cannot be copied; `name` names the file for the failure.
Status CopyExtendedAttributes(const FileDescriptor& from, const FileDescriptor& to, const std::string& name);

}  // namespace vorn

#endif  // VORN_LINUX_SYSTEM_EXTENDED_ATTRIBUTES_H

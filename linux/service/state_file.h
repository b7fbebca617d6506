// Small files in which the platform remembers something between its runs.
#ifndef VORN_LINUX_SERVICE_STATE_FILE_H
#define VORN_LINUX_SERVICE_STATE_FILE_H

#include <string>

#include "box.h"
#include "status.h"

namespace vorn {

// Makes the file at the box's `path` contain `text`, under the configuration lock. Writes nothing if it does already.
Status StoreState(Box& box, const std::string& path, const std::string& text);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_STATE_FILE_H

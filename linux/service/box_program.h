// Programs of the box that the module runs.
#ifndef VORN_LINUX_SERVICE_BOX_PROGRAM_H
#define VORN_LINUX_SERVICE_BOX_PROGRAM_H

#include <string>
#include <vector>

#include "box.h"
#include "status.h"

namespace vorn {

// Runs the program at the box's path `program` and waits for it, for a minute at most; its output goes to the
// log. The configuration locks of the calling thread are released meanwhile. Fails with kProgramFailed unless the
// exit status is 0, and with EROFS in a call that may not write. In a rehearsal nothing is run: "S83nfsd.sh
// reloadidmap" is recorded, and every other program is refused with EROFS.
Status RunBoxProgram(Box& box, const std::string& program, const std::vector<std::string>& arguments);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_BOX_PROGRAM_H

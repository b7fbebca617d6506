// Remarks about operations that succeed: what an administrator should know without anything having failed.
#ifndef VORN_LINUX_BOX_NOTICE_H
#define VORN_LINUX_BOX_NOTICE_H

#include <string>

#include "store.h"

namespace vorn {

// Logs the sentence with this priority (syslog(3)), unless the call is a rehearsal: then it would not be true.
void LogDone(int priority, const std::string& sentence);

// Logs the sentence as a warning, except in a rehearsal, and adds it to the warnings of the current call (call.h), if
// there is one.
void Notice(const std::string& sentence);

// The same for a remark about the content of the file at `location`: it is logged once per version of the file, and
// added to the warnings of each call.
void NoticeOnce(const std::string& location, const Version& version, const std::string& sentence);

}  // namespace vorn

#endif  // VORN_LINUX_BOX_NOTICE_H

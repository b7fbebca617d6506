// Directories that stay exported although they are no shares any more.
#ifndef VORN_LINUX_SERVICE_LEFT_SHARES_H
#define VORN_LINUX_SERVICE_LEFT_SHARES_H

#include <string>
#include <vector>

#include "box.h"
#include "exports_document.h"
#include "status.h"

namespace vorn {

// A share that leaves shares.conf keeps its line in /etc/exports, and the API cannot change it any more. Names each
// such directory in the log. With the setting withdraw_left_shares its rules are removed from /etc/exports.
//
// /var/lib/vorn/exported-shares remembers which exported directories are or were shares, so an administrator's own
// lines about other directories are left alone. Nothing is concluded from a shares.conf that does not exist.
//
// `exports` is the content of /etc/exports. Returns whether rules were removed from the file.
Result<bool> CheckLeftShares(Box& box, const ExportsDocument& exports);

// Returns the directories that CheckLeftShares would name or withdraw. Changes nothing.
Result<std::vector<std::string>> FindLeftShares(Box& box, const ExportsDocument& exports);

}  // namespace vorn

#endif  // VORN_LINUX_SERVICE_LEFT_SHARES_H

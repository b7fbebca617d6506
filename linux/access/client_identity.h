// The identity of a user of a client on the server.
#ifndef VORN_LINUX_ACCESS_CLIENT_IDENTITY_H
#define VORN_LINUX_ACCESS_CLIENT_IDENTITY_H

#include <optional>

#include "access.h"
#include "box.h"
#include "export_decision.h"
#include "status.h"

namespace vorn {

// The ids with which a user comes to the squash options: those that a client sends, or those of a Kerberos principal.
struct ClientIDs {
  VORN::AccessIdentity identity;
  bool is_refused = false;  // the server refuses the principal, because its mapping names no account
  bool is_nobody = false;   // nothing maps the principal; the server takes the ids of anonymous users
};

// Finds the ids of the user of a question, which is not empty. With the flavour "sys" the groups are those that the
// client sends, unless the server looks them up itself (nfs.conf(5), manage-gids). Principals are mapped as
// rpc.svcgssd(8) does. Fails with kNoSuchUser or kNoSuchGroup.
Result<ClientIDs> FindClientIDs(Box& box, const VORN::AccessQuestion& question);

// Applies the squash options of a rule to the ids, as nfsd does.
VORN::AccessIdentity Squash(const ClientIDs& client, const ExportAccess& access, const TableExport& rule);

}  // namespace vorn

#endif  // VORN_LINUX_ACCESS_CLIENT_IDENTITY_H

// The methods of the server itself: tokens of programs, and sessions.
#ifndef VORN_SERVER_SERVER_METHODS_H
#define VORN_SERVER_SERVER_METHODS_H

#include "routes.h"
#include "sessions.h"
#include "token_store.h"

namespace vorn::server {

// The descriptor of these methods, VORN.Server.json of this folder.
const Descriptor& ServerDescriptor();

// Adds VORN.Server.Token (create, list, revoke) and VORN.Server.Session (sign_in, get, sign_out, list, end) to the
// routes. The route of sign_in only lists and describes it: it is a call without a caller, which WebApi answers with a
// SignInCall. A token can be restricted to the APIs that the routes have before. The stores must outlive the routes.
void AddServerMethods(TokenStore& tokens, Sessions& sessions, Routes* routes);

}  // namespace vorn::server

#endif  // VORN_SERVER_SERVER_METHODS_H

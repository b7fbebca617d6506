// The methods of the server itself: tokens of programs, and sessions.
#ifndef VORN_SERVER_SERVER_METHODS_H
#define VORN_SERVER_SERVER_METHODS_H

#include "routes.h"
#include "sessions.h"
#include "token_store.h"

namespace vorn::server {

// Adds VORN.Server.Token (create, list, revoke) and VORN.Server.Session (get, sign_out, list, end) to the routes. The
// method sign_in is a call without a caller: see sign_in_call.h. A token can be restricted to the APIs that the routes
// have before. The stores must outlive the routes.
void AddServerMethods(TokenStore& tokens, Sessions& sessions, Routes* routes);

}  // namespace vorn::server

#endif  // VORN_SERVER_SERVER_METHODS_H

// The OpenAPI 3.1 document of the server: openapi.json of this folder, and the descriptors of
// the server's own methods and of the modules.
#ifndef VORN_SERVER_OPENAPI_H
#define VORN_SERVER_OPENAPI_H

#include <json/value.h>

#include "routes.h"

namespace vorn::server {

// Describes all methods of the routes that their descriptors describe. The server adds what all methods have: the
// envelope of the answers, the answers of the server itself, and the headers of revisions.
//
// A module is left out, and the reason is logged, if one of its schemas has the name of a different schema of the
// server or of another module.
Json::Value OpenApiDocument(const Routes& routes);

}  // namespace vorn::server

#endif  // VORN_SERVER_OPENAPI_H

// Files of this folder that are part of the program.
#ifndef VORN_SERVER_RESOURCES_H
#define VORN_SERVER_RESOURCES_H

#include <string_view>

namespace vorn::server {

extern const std::string_view kOpenApiBase;       // openapi.json: the OpenAPI document without any module
extern const std::string_view kServerDescriptor;  // VORN.Server.json: the descriptor of the server's own methods
extern const std::string_view kDocsPage;          // docs.html: the documentation of the API, made by scripts/api-docs
extern const std::string_view kDocsStyle;         // docs.css

}  // namespace vorn::server

#endif  // VORN_SERVER_RESOURCES_H

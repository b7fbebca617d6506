// Modules: shared libraries that export GetAPITable (see webapi.h).
#ifndef VORN_SERVER_MODULE_H
#define VORN_SERVER_MODULE_H

#include <string>
#include <vector>

#include "descriptor.h"
#include "webapi.h"

namespace vorn::server {

// A loaded module. Its library stays loaded as long as the process lives.
struct Module {
  std::string path;
  std::vector<APIRow> rows;  // without the terminator
  Descriptor descriptor;
};

// Loads every X.so of `folder`, in the order of their names. A module that cannot be used is
// logged and skipped, and so is a faulty descriptor.
std::vector<Module> LoadModules(const std::string& folder);

}  // namespace vorn::server

#endif  // VORN_SERVER_MODULE_H

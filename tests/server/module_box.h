// The real module of the NFS service on the Linux platform, with a box that has two shared folders.
#ifndef VORN_TESTS_SERVER_MODULE_BOX_H
#define VORN_TESTS_SERVER_MODULE_BOX_H

#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "api_table.h"
#include "entry_function.h"
#include "temporary_root.h"

namespace vorn::server {

// The module as vornd loads it, with its descriptor.
inline std::vector<Module> NfsModule() {
  std::ifstream file(NFS_DESCRIPTOR);
  const std::string text{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
  std::string error;
  std::vector<APIRow> rows;
  for (const APIRow* row = gTable; row->api != nullptr; ++row) rows.push_back(*row);
  return {{"nfs.so", std::move(rows), Descriptor::Parse(text, &error).value()}};
}

class ModuleBox : public testing::Test {
 protected:
  ModuleBox() {
    root_.Write("/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nkerberos = yes\nfirewall = no\n");
    root_.Write("/etc/vorn/shares.conf", "[shares]\ndata = /volume1/data\nmore = /volume1/more\n");
    root_.Write("/volume1/data/README", "");
    root_.Write("/volume1/more/README", "");
    root_.Write("/etc/exports", "# ours\n");
    root_.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nadmin:x:999:999::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n");
  }

  // The method with this path, such as "/api/VORN.Core.FileServ.NFS/v1/get".
  const Route& RouteOf(const std::string& path) const {
    std::string unknown;
    const Route* route = routes_.Find(path, &unknown);
    if (route == nullptr) throw std::runtime_error(unknown);
    return *route;
  }

  const TemporaryRoot root_;
  const std::vector<Module> modules_ = NfsModule();
  const Routes routes_{modules_};
};

}  // namespace vorn::server

#endif  // VORN_TESTS_SERVER_MODULE_BOX_H

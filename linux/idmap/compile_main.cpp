// idmap-compile: gives the NFS daemons the ID map that is stored now (compiled_idmap.h). Prints a sentence for each
// mapping that has no user. The exit status is 1, with a reason, if the daemons keep what they have.
#include <cstdio>
#include <exception>
#include <memory>

#include "compiled_idmap.h"
#include "file_store.h"
#include "root.h"

namespace {

vorn::Result<vorn::Engine*> NoEngine(vorn::Box& /*box*/) {
  return vorn::Status::Failure(vorn::kUnknownService, "idmap-compile operates no service");
}

int Run() {
  const vorn::Root root = vorn::Root::Current();
  vorn::Box box(root, std::make_unique<vorn::FileStore>(root), NoEngine);
  const vorn::Result<std::vector<std::string>> sentences = vorn::CompileIDMap(box);
  if (!sentences.ok()) {
    std::fprintf(stderr, "idmap-compile: %s\n", sentences.status().reason().c_str());
    return 1;
  }
  for (const std::string& sentence : *sentences) std::puts(sentence.c_str());
  return 0;
}

}  // namespace

int main() {
  try {
    return Run();
  } catch (const std::exception& error) {
    std::fprintf(stderr, "idmap-compile: %s\n", error.what());
    return 1;
  }
}

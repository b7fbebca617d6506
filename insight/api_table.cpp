#include "access_handler.h"

namespace {

// An entry function constructs the handler, runs one driver and propagates every exception.
template <class Handler, void (Handler::*kDriver)()>
void Serve(VORN::APIRequest* request, VORN::APIResponse* response) {
  Handler handler(request, response);
  (handler.*kDriver)();
}

constexpr char kAccess[] = "VORN.Core.FileServ.NFS.Access";

const APIRow kTable[] = {{kAccess, 1, "explain", Serve<AccessHandler, &AccessHandler::Explain>},
                         {kAccess, 1, "matrix", Serve<AccessHandler, &AccessHandler::Matrix>},
                         {nullptr, 0, nullptr, nullptr}};

}  // namespace

// Returns the address of the first row. Never fails and is thread-safe.
extern "C" __attribute__((visibility("default"))) const void* GetAPITable();
const void* GetAPITable() { return kTable; }

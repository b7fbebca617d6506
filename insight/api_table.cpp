#include "access_handler.h"
#include "clients_handler.h"
#include "health_handler.h"
#include "history_handler.h"

namespace {

// An entry function constructs the handler, runs one driver and propagates every exception.
template <class Handler, void (Handler::*kDriver)()>
void Serve(VORN::APIRequest* request, VORN::APIResponse* response) {
  Handler handler(request, response);
  (handler.*kDriver)();
}

constexpr char kAccess[] = "VORN.Core.FileServ.NFS.Access";
constexpr char kClient[] = "VORN.Core.FileServ.NFS.Client";
constexpr char kHealth[] = "VORN.Core.FileServ.NFS.Health";
constexpr char kHistory[] = "VORN.Core.FileServ.NFS.History";

const APIRow kTable[] = {{kAccess, 1, "explain", Serve<AccessHandler, &AccessHandler::Explain>},
                         {kAccess, 1, "matrix", Serve<AccessHandler, &AccessHandler::Matrix>},
                         {kClient, 1, "list", Serve<ClientsHandler, &ClientsHandler::List>},
                         {kClient, 1, "disconnect", Serve<ClientsHandler, &ClientsHandler::Disconnect>},
                         {kHealth, 1, "check", Serve<HealthHandler, &HealthHandler::Check>},
                         {kHistory, 1, "list", Serve<HistoryHandler, &HistoryHandler::List>},
                         {kHistory, 1, "show", Serve<HistoryHandler, &HistoryHandler::Show>},
                         {kHistory, 1, "undo", Serve<HistoryHandler, &HistoryHandler::Undo>},
                         {nullptr, 0, nullptr, nullptr}};

}  // namespace

// Returns the address of the first row. Never fails and is thread-safe.
extern "C" __attribute__((visibility("default"))) const void* GetAPITable();
const void* GetAPITable() { return kTable; }

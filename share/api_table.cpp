#include "share_handler.h"

namespace {

// An entry function constructs the handler, runs one driver and propagates every exception.
template <void (ShareHandler::*kDriver)()>
void Serve(VORN::APIRequest* request, VORN::APIResponse* response) {
  ShareHandler handler(request, response);
  (handler.*kDriver)();
}

constexpr char kAPI[] = "VORN.Core.Share";

const APIRow kTable[] = {{kAPI, 1, "list", Serve<&ShareHandler::List>},
                         {kAPI, 1, "get", Serve<&ShareHandler::Get>},
                         {kAPI, 1, "create", Serve<&ShareHandler::Create>},
                         {kAPI, 1, "delete", Serve<&ShareHandler::Delete>},
                         {nullptr, 0, nullptr, nullptr}};

}  // namespace

// Returns the address of the first row. Never fails and is thread-safe.
extern "C" __attribute__((visibility("default"))) const void* GetAPITable();
const void* GetAPITable() { return kTable; }

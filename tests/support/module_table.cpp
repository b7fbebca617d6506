#include "module_table.h"

#include <stdexcept>

extern "C" __attribute__((weak)) const void* GetAPITable();

namespace {

template <typename Predicate>
const APIRow* FindRow(Predicate is_wanted) {
  if (GetAPITable == nullptr) return nullptr;
  for (const auto* row = static_cast<const APIRow*>(GetAPITable()); row->api != nullptr; ++row) {
    if (is_wanted(*row)) return row;
  }
  return nullptr;
}

}  // namespace

const APIRow* RowOf(EntryFunction entry) {
  return FindRow([&](const APIRow& row) { return row.handler == entry; });
}

EntryFunction EntryOf(const std::string& api, const std::string& method) {
  const APIRow* const row =
      FindRow([&](const APIRow& one) { return one.version == 1 && one.api == api && one.method == method; });
  if (row == nullptr) throw std::logic_error("the module has no method " + api + "/v1/" + method);
  return row->handler;
}

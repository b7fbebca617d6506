// The table of the module that a test program is linked with.
#ifndef VORN_TESTS_SUPPORT_MODULE_TABLE_H
#define VORN_TESTS_SUPPORT_MODULE_TABLE_H

#include <string>

#include "webapi.h"

using EntryFunction = decltype(APIRow::handler);

// Returns the row of an entry function; nullptr for any other function, and if there is no module.
const APIRow* RowOf(EntryFunction entry);

// Returns the entry function that the server calls for version 1 of a method. Throws std::logic_error if the table has
// none.
EntryFunction EntryOf(const std::string& api, const std::string& method);

#endif  // VORN_TESTS_SUPPORT_MODULE_TABLE_H

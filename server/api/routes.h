// Maps the path of a request to the row of a module's table.
#ifndef VORN_SERVER_ROUTES_H
#define VORN_SERVER_ROUTES_H

#include <json/value.h>

#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "caller.h"
#include "message.h"
#include "module.h"

namespace vorn::server {

// A method of the server itself. Called on a worker thread, with the parameters and the caller.
using ServerMethod = std::function<Response(const Json::Value& parameters, const Caller& caller)>;

// A method that can be called.
struct Route {
  APIRow row;
  const Descriptor* descriptor;
  Descriptor::Method method;  // the descriptor's entry for it
  bool for_readers = false;   // else for administrators alone
  ServerMethod own{};         // not null: called instead of row.handler, which is null then

  // The reading method that shows what this method changes, or nullptr.
  const Route* shown_by = nullptr;

  std::string Name() const;  // "Api v1 method", for the log
  std::string Id() const;    // "Api/v1/method", as in its path
};

class Routes {
 public:
  // The modules must outlive this. If two rows have the same name, the first one is used. The second one is
  // logged, and so are each path of a descriptor that belongs to none of its module's rows, and each x-shown-by that
  // names no reading method.
  explicit Routes(const std::vector<Module>& modules);

  // Adds a method of the server itself, unless there is one of this name. The names must live as long as this.
  void Add(const Route& route);

  // Returns the row of "/api/{api}/v{version}/{method}", or nullptr. `unknown` then says which of the
  // three is unknown.
  const Route* Find(std::string_view path, std::string* unknown) const;

  // Returns all rows as [{"api": ..., "version": ..., "method": ...}, ...].
  Json::Value List() const;

  const std::vector<Module>& modules() const { return modules_; }

 private:
  using Methods = std::map<std::string, Route, std::less<>>;
  using Versions = std::map<int, Methods>;

  void AddRow(const APIRow& row, const Module& module);
  void PairWithReader(Route* route) const;

  const std::vector<Module>& modules_;
  std::map<std::string, Versions, std::less<>> apis_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_ROUTES_H

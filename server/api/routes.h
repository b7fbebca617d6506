// From the path of a request to the row of a module's table.
#ifndef VORN_SERVER_ROUTES_H
#define VORN_SERVER_ROUTES_H

#include <json/value.h>

#include <functional>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "module.h"

namespace vorn::server {

struct Route {
  APIRow row;
  const Descriptor* descriptor;

  std::string Name() const;  // "API v1 method", for the log
};

class Routes {
 public:
  // The modules must outlive this. Of two rows with one name the first is taken, the other logged.
  explicit Routes(const std::vector<Module>& modules);

  // The row of "/api/{api}/v{version}/{method}". Null when there is none: `unknown` then says which
  // of the three is unknown.
  const Route* Find(std::string_view path, std::string* unknown) const;

  // All rows, as [{"api": ..., "version": ..., "method": ...}, ...].
  Json::Value List() const;

 private:
  using Methods = std::map<std::string, Route, std::less<>>;
  using Versions = std::map<int, Methods>;

  void Add(const APIRow& row, const Module& module);

  std::map<std::string, Versions, std::less<>> apis_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_ROUTES_H

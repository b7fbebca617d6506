#include "module.h"

#include <dlfcn.h>
#include <syslog.h>

#include <cerrno>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <memory>
#include <optional>
#include <set>
#include <system_error>
#include <utility>

namespace vorn::server {
namespace {

// Limit for a table without a terminator; far more than the rows of any module.
constexpr std::size_t kMaxRows = 4096;

struct CloseLibrary {
  void operator()(void* library) const { dlclose(library); }
};
using Library = std::unique_ptr<void, CloseLibrary>;

std::set<std::string> FilesToLoad(const std::string& folder) {
  std::set<std::string> files;
  std::error_code failure;
  for (const auto& entry : std::filesystem::directory_iterator(folder, failure)) {
    if (entry.path().extension() == ".so") files.insert(entry.path().string());
  }
  if (failure) syslog(LOG_ERR, "%s: cannot be read: %s", folder.c_str(), failure.message().c_str());
  return files;
}

Descriptor ReadDescriptor(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    syslog(LOG_INFO, "%s: no descriptor: %s", path.c_str(), std::strerror(errno));
    return {};
  }
  const std::string text{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
  std::string error;
  std::optional<Descriptor> descriptor = Descriptor::Parse(text, &error);
  if (!descriptor) syslog(LOG_ERR, "%s: descriptor ignored: %s", path.c_str(), error.c_str());
  return std::move(descriptor).value_or(Descriptor());
}

std::optional<std::vector<APIRow>> ReadTable(void* library, std::string* error) {
  const auto get_table = reinterpret_cast<GetAPITableFunction>(dlsym(library, "GetAPITable"));
  const auto* row = get_table == nullptr ? nullptr : static_cast<const APIRow*>(get_table());
  if (row == nullptr) {
    *error = get_table == nullptr ? "no GetAPITable" : "GetAPITable answers null";
    return std::nullopt;
  }
  std::vector<APIRow> rows;
  for (; row->api != nullptr && rows.size() < kMaxRows; ++row) {
    if (row->method == nullptr || row->handler == nullptr) {
      *error = "row " + std::to_string(rows.size() + 1) + " of the table is incomplete";
      return std::nullopt;
    }
    rows.push_back(*row);
  }
  if (!rows.empty() && rows.size() < kMaxRows) return rows;
  *error = rows.empty() ? "the table is empty" : "the table has no end";
  return std::nullopt;
}

std::optional<Module> LoadModule(const std::string& path, std::string* error) {
  Library library(dlopen(path.c_str(), RTLD_NOW | RTLD_LOCAL));
  if (!library) {
    *error = dlerror();
    return std::nullopt;
  }
  std::optional<std::vector<APIRow>> rows = ReadTable(library.get(), error);
  if (!rows) return std::nullopt;
  // The library is never unloaded: its code may run on any thread until the process ends.
  static_cast<void>(library.release());
  const std::string descriptor = std::filesystem::path(path).replace_extension(".json").string();
  return Module{path, std::move(*rows), ReadDescriptor(descriptor)};
}

}  // namespace

std::vector<Module> LoadModules(const std::string& folder) {
  std::vector<Module> modules;
  for (const std::string& path : FilesToLoad(folder)) {
    std::string error;
    std::optional<Module> module = LoadModule(path, &error);
    if (!module) {
      syslog(LOG_ERR, "%s: module left out: %s", path.c_str(), error.c_str());
      continue;
    }
    syslog(LOG_INFO, "%s: %zu methods", path.c_str(), module->rows.size());
    modules.push_back(std::move(*module));
  }
  return modules;
}

}  // namespace vorn::server

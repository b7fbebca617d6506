// The console, the administrator's page: static files that every visitor gets without credentials. The page calls the
// methods with the credentials of its user.
#ifndef VORN_SERVER_CONSOLE_H
#define VORN_SERVER_CONSOLE_H

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "http.h"

namespace vorn::server {

class Console {
 public:
  // Without files.
  Console() = default;

  // Reads all files of the folder and of the folders below it into memory, so that no request opens a file. "x.gz" is
  // the compressed content of "x". Files with an extension that the page does not use are ignored. A folder or file
  // that cannot be read is logged.
  explicit Console(const std::string& folder);

  // Whether the path belongs to the console: it is that of one of its files, or below "/assets/".
  bool Owns(std::string_view path) const;

  // Returns whether the path is that of the page itself, "/", to which links of other sites may lead.
  static bool IsPage(std::string_view path) { return path == "/"; }

  // Returns the file of a path that the console owns, in the coding that the client accepts; status 404 if there is no
  // such file. Thread-safe.
  Response Get(const Head& head) const;

 private:
  using Content = std::shared_ptr<const std::string>;

  struct File {
    Content plain;
    Content packed;  // by gzip; nullptr if there is none
    std::string_view type;
    std::string tag;  // the entity tag of the plain content
  };

  void Add(const std::string& folder, const std::string& path);

  std::map<std::string, File, std::less<>> files_;  // by the path of a request
};

}  // namespace vorn::server

#endif  // VORN_SERVER_CONSOLE_H

// The command line of vornd.
#ifndef VORN_SERVER_OPTIONS_H
#define VORN_SERVER_OPTIONS_H

#include <string>
#include <variant>
#include <vector>

namespace vorn::server {

struct Options {
  std::string root = "/";
  std::string modules;                        // empty: where this program's modules are
  std::vector<std::string> host_names;        // of this server, besides localhost
  std::vector<std::string> listen;            // empty: the Unix socket below the root
  std::string administrators = "vorn-admin";  // the group whose members may do everything
  std::string readers = "vorn-readonly";      // the group whose members may call methods that only read
  bool sign_in_link = false;                  // print a one-time link
};

// Returns the options, or the exit status if the program must end: 0 after printing help or version, 2 after
// printing an error of the command line.
std::variant<Options, int> ParseOptions(int argc, const char* const* argv);

}  // namespace vorn::server

#endif  // VORN_SERVER_OPTIONS_H

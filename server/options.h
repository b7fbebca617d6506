// The command line of vornd.
#ifndef VORN_SERVER_OPTIONS_H
#define VORN_SERVER_OPTIONS_H

#include <string>
#include <variant>
#include <vector>

namespace vorn::server {

struct Options {
  std::string root = "/";
  std::string config;         // empty: ROOT/etc/vorn/vornd.conf, which may be missing
  bool check = false;         // only check the configuration
  bool sign_in_link = false;  // print a one-time link

  // These override the configuration file, unless they are empty.
  std::string modules;
  std::vector<std::string> host_names;
  std::vector<std::string> listen;
  std::string administrators;
  std::string readers;
};

// Returns the options, or the exit status if the program must end: 0 after printing help or version, 2 after
// printing an error of the command line.
std::variant<Options, int> ParseOptions(int argc, const char* const* argv);

}  // namespace vorn::server

#endif  // VORN_SERVER_OPTIONS_H

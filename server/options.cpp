#include "options.h"

#include <CLI/CLI.hpp>

namespace vorn::server {
namespace {

constexpr const char* kFooter =
    "\nADDRESS is unix:/PATH, 127.0.0.1:PORT, [::1]:PORT or, with TLS, tls:ADDRESS:PORT.\n"
    "Without any, and without sockets from systemd, it is unix:ROOT/run/vorn/vornd.sock.\n"
    "The configuration file, which the options override, is described in vornd.conf(5).";

}  // namespace

std::variant<Options, int> ParseOptions(int argc, const char* const* argv) {
  Options options;
  CLI::App app("The web-API server: loads modules and serves their methods over HTTP.", "vornd");
  app.set_version_flag("--version", std::string("vornd ") + VORN_VERSION);
  app.footer(kFooter);
  app.add_option("--root", options.root, "Serve the box whose files are below DIR")
      ->type_name("DIR")
      ->take_last()
      ->capture_default_str();
  app.add_option("--config", options.config, "Read FILE instead of ROOT/etc/vorn/vornd.conf")
      ->type_name("FILE")
      ->take_last();
  app.add_flag("--check", options.check, "Report what is wrong with the configuration, and end");
  app.add_option("--modules", options.modules, "Load the modules in DIR")->type_name("DIR")->take_last();
  app.add_option("--listen", options.listen, "Listen at ADDRESS; may be given several times")
      ->type_name("ADDRESS")
      ->allow_extra_args(false);
  app.add_option("--host-name", options.host_names,
                 "Accept requests and pages of https://NAME; may be given several times")
      ->type_name("NAME")
      ->allow_extra_args(false);
  app.add_option("--administrators", options.administrators, "Members of GROUP may do everything")
      ->type_name("GROUP")
      ->take_last();
  app.add_option("--readers", options.readers, "Members of GROUP may call the methods that only read")
      ->type_name("GROUP")
      ->take_last();
  app.add_flag("--sign-in-link", options.sign_in_link,
               "With a --root of your own: print a link with which somebody can sign in once");
  try {
    app.parse(argc, argv);
    if (options.sign_in_link && options.root == "/") {
      throw CLI::ValidationError("--sign-in-link", "needs a --root of your own");
    }
  } catch (const CLI::ParseError& error) {
    return app.exit(error) == 0 ? 0 : 2;
  }
  return options;
}

}  // namespace vorn::server

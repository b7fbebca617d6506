// The settings in force: those of the configuration file, overridden by the command line.
#ifndef VORN_SERVER_CONFIGURATION_H
#define VORN_SERVER_CONFIGURATION_H

#include <string>
#include <vector>

#include "options.h"
#include "settings.h"

namespace vorn::server {

// The path of the file: that of --config, otherwise ROOT/etc/vorn/vornd.conf, which may be missing.
std::string ConfigurationPath(const Options& options);

struct Configuration {
  Settings settings{};
  std::vector<std::string> faults{};  // lines for an administrator; if there is one, the settings are not to be used
};

// Reads the file and applies the options. A fault of the file begins with "PATH:LINE:COLUMN: ".
Configuration LoadConfiguration(const Options& options);

// The keys that have other values in `next`, and that only a restart applies: "[server] listen".
std::vector<std::string> NeedRestart(const Settings& current, const Settings& next);

}  // namespace vorn::server

#endif  // VORN_SERVER_CONFIGURATION_H

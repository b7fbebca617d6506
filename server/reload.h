// Applies the settings that may change while the server runs.
#ifndef VORN_SERVER_RELOAD_H
#define VORN_SERVER_RELOAD_H

#include <string>
#include <vector>

#include "authenticator.h"
#include "browser_guard.h"
#include "options.h"
#include "password_checker.h"
#include "sessions.h"
#include "settings.h"
#include "tls.h"

namespace vorn::server {

// The objects that a reload changes.
struct Reloadable {
  Sessions& sessions;
  Authenticator& authenticator;
  PasswordChecker& passwords;
  OwnNames& names;
  TlsServer* tls;  // null: no listener has TLS
};

// The command of the program that checks passwords.
std::vector<std::string> PasswordHelper(const Options& options, const Settings& settings);

Sessions::Limits SessionLimits(const Settings& settings);

// The file of the self-signed certificate. The state folder may be missing.
std::string SelfSignedPath(const Options& options);

void Apply(const Options& options, const Settings& settings, const Reloadable& parts);

// Reads the configuration again, applies it, and stores it in `settings`. If it has a fault, which is logged, nothing
// changes.
void Reload(const Options& options, const Reloadable& parts, Settings* settings);

}  // namespace vorn::server

#endif  // VORN_SERVER_RELOAD_H

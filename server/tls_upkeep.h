// Keeps the certificate of a running server valid.
#ifndef VORN_SERVER_TLS_UPKEEP_H
#define VORN_SERVER_TLS_UPKEEP_H

#include <ctime>
#include <memory>
#include <string>

#include "settings.h"
#include "tls.h"

namespace vorn::server {

// Each function takes the path of the self-signed certificate, see tls_files.h.

// Returns the TLS of a new server, with the identity that the settings name. Logs its fingerprint, and a warning if it
// expires soon. Returns nullptr, with the reason in `error`, on failure.
std::unique_ptr<TlsServer> OpenTlsServer(const Settings& settings, const std::string& path, std::time_t now,
                                         std::string* error);

// Makes new connections use the identity, and sets the headers of the settings. Logs the fingerprint if it is another
// one than before.
void ApplyTls(const Settings& settings, const TlsIdentityPtr& identity, TlsServer* tls);

// To be called now and then: makes a new self-signed certificate if the present one expires soon, and logs a warning if
// a certificate of others does. On failure, which is logged, the present one is kept.
void MaintainTls(const Settings& settings, const std::string& path, std::time_t now, TlsServer* tls);

// Loads the certificate that the settings name, or the self-signed one if there is one; makes none. Returns nullptr,
// with the reason in `error`, if it cannot be used.
TlsIdentityPtr CheckTls(const Settings& settings, const std::string& path, std::string* error);

}  // namespace vorn::server

#endif  // VORN_SERVER_TLS_UPKEEP_H

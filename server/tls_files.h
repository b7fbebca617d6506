// Where the server's certificate and key come from.
#ifndef VORN_SERVER_TLS_FILES_H
#define VORN_SERVER_TLS_FILES_H

#include <ctime>
#include <string>

#include "settings.h"
#include "tls.h"

namespace vorn::server {

// Whether one of the addresses to listen at has TLS.
bool WantsTls(const Settings& settings);

// Reads the certificate and the key that the settings name. Returns nullptr, with the reason in `error`, if they cannot
// be used, do not belong together, or every user may read the key.
TlsIdentityPtr ReadTlsFiles(const Settings& settings, std::string* error);

// Reads the file of the self-signed certificate, which has the key, too. Returns nullptr if there is none (`error` is
// empty) or it cannot be used.
TlsIdentityPtr ReadSelfSigned(const std::string& path, std::string* error);

// Returns the identity for connections: of the files that the settings name, otherwise of the self-signed certificate
// in `path` (mode 0600). That one is made if it is missing, cannot be used, expires within 30 days of `now` or is not
// for one of the server's host names. Returns nullptr, with the reason in `error`, on failure.
TlsIdentityPtr OpenTlsIdentity(const Settings& settings, const std::string& path, std::time_t now, std::string* error);

// Returns what an administrator should know about the end of the certificate; empty if that is more than 14 days away.
std::string ExpiryWarning(const TlsIdentity& identity, std::time_t now);

}  // namespace vorn::server

#endif  // VORN_SERVER_TLS_FILES_H

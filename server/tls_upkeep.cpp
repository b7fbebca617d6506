#include "tls_upkeep.h"

#include <syslog.h>

#include "tls_files.h"

namespace vorn::server {
namespace {

// Returns the value of the header; empty if it is not to be sent.
std::string StrictTransport(const Settings& settings) {
  const auto seconds = settings.strict_transport.time.count();
  return seconds == 0 ? "" : "max-age=" + std::to_string(seconds);
}

void WarnOfExpiry(const TlsIdentity& identity, std::time_t now) {
  const std::string warning = ExpiryWarning(identity, now);
  if (!warning.empty()) syslog(LOG_WARNING, "%s", warning.c_str());
}

}  // namespace

std::unique_ptr<TlsServer> OpenTlsServer(const Settings& settings, const std::string& path, std::time_t now,
                                         std::string* error) {
  const TlsIdentityPtr identity = OpenTlsIdentity(settings, path, now, error);
  if (!identity) return nullptr;
  auto tls = std::make_unique<TlsServer>(nullptr);
  ApplyTls(settings, identity, tls.get());
  WarnOfExpiry(*identity, now);
  return tls;
}

void ApplyTls(const Settings& settings, const TlsIdentityPtr& identity, TlsServer* tls) {
  tls->SetStrictTransport(StrictTransport(settings));
  const TlsIdentityPtr before = tls->identity();
  tls->Replace(identity);
  if (before && before->fingerprint() == identity->fingerprint()) return;
  syslog(LOG_NOTICE, "The TLS certificate has the SHA-256 fingerprint %s", identity->fingerprint().c_str());
}

void MaintainTls(const Settings& settings, const std::string& path, std::time_t now, TlsServer* tls) {
  if (settings.certificate.path.empty()) {
    std::string error;
    const TlsIdentityPtr identity = OpenTlsIdentity(settings, path, now, &error);
    if (identity) ApplyTls(settings, identity, tls);
    if (!identity) syslog(LOG_ERR, "%s", error.c_str());
  }
  WarnOfExpiry(*tls->identity(), now);
}

TlsIdentityPtr CheckTls(const Settings& settings, const std::string& path, std::string* error) {
  if (!settings.certificate.path.empty()) return ReadTlsFiles(settings, error);
  return WantsTls(settings) ? ReadSelfSigned(path, error) : nullptr;
}

}  // namespace vorn::server

// The certificate and key of the server, and the protocol rules of its TLS connections (RFC 8446, RFC 5246).
#ifndef VORN_SERVER_TLS_H
#define VORN_SERVER_TLS_H

#include <ctime>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <utility>

struct ssl_ctx_st;  // SSL_CTX of OpenSSL
struct ssl_st;      // SSL

namespace vorn::server {

struct FreeTlsConnection {
  void operator()(ssl_st* connection) const;
};
using TlsConnection = std::unique_ptr<ssl_st, FreeTlsConnection>;

// A certificate with its key, ready for connections. Immutable.
class TlsIdentity {
 public:
  // `certificates` is the server's certificate and those of its issuers up to the root, `key` the private key, both in
  // PEM. Returns nullptr, with the reason in `error`, if one of them cannot be used or they do not belong together.
  static std::shared_ptr<const TlsIdentity> Make(std::string_view certificates, std::string_view key,
                                                 std::string* error);

  // The SHA-256 digest of the certificate: pairs of hexadecimal digits in upper case, separated by colons.
  const std::string& fingerprint() const { return fingerprint_; }
  std::time_t not_after() const { return not_after_; }

  // Returns whether the certificate is for this host name, or for this IP address.
  bool Covers(const std::string& name) const;

  // Returns the state of a new connection that will be accepted; nullptr without memory.
  TlsConnection NewConnection() const;

 private:
  using Context = std::shared_ptr<ssl_ctx_st>;
  TlsIdentity(Context context, std::string fingerprint, std::time_t not_after)
      : context_(std::move(context)), fingerprint_(std::move(fingerprint)), not_after_(not_after) {}

  Context context_;
  std::string fingerprint_;
  std::time_t not_after_;
};

using TlsIdentityPtr = std::shared_ptr<const TlsIdentity>;

// The identity of new connections. A connection keeps the one that it began with. Thread-safe.
class TlsServer {
 public:
  explicit TlsServer(TlsIdentityPtr identity) : identity_(std::move(identity)) {}

  TlsIdentityPtr identity() const;
  void Replace(TlsIdentityPtr identity);

  // The Strict-Transport-Security header (RFC 6797) of answers; empty if there is none.
  std::string strict_transport() const;
  void SetStrictTransport(std::string value);

 private:
  mutable std::mutex mutex_;
  TlsIdentityPtr identity_;  // with mutex_
  std::string strict_transport_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_TLS_H

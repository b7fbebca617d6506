#include "tls.h"

#include <openssl/bio.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>

#include <array>
#include <cstddef>

#include "openssl_objects.h"

namespace vorn::server {
namespace {

// Forward secrecy and authenticated encryption only (RFC 9325, 4.2). TLS 1.3 has no other suites.
constexpr const char* kCiphers =
    "ECDHE-ECDSA-AES128-GCM-SHA256:ECDHE-RSA-AES128-GCM-SHA256:ECDHE-ECDSA-AES256-GCM-SHA384:"
    "ECDHE-RSA-AES256-GCM-SHA384:ECDHE-ECDSA-CHACHA20-POLY1305:ECDHE-RSA-CHACHA20-POLY1305";
constexpr const char* kGroups = "X25519:P-256:P-384";
constexpr std::array<unsigned char, 9> kHttp11 = {8, 'h', 't', 't', 'p', '/', '1', '.', '1'};

Bio Reader(std::string_view text) { return Bio(BIO_new_mem_buf(text.data(), static_cast<int>(text.size()))); }

// Returns OpenSSL's reason for the last failure in this thread, and clears all.
std::string TakeReason() {
  const char* reason = ERR_reason_error_string(ERR_peek_last_error());
  std::string text = reason == nullptr ? "no memory" : reason;
  ERR_clear_error();
  return text;
}

// Without it, OpenSSL would ask for the password of an encrypted key at the terminal.
int NoPassword(char* /*buffer*/, int /*size*/, int /*writing*/, void* /*data*/) { return -1; }

// Selects HTTP/1.1; a client that offers only other protocols is refused (RFC 7301, 3.2).
int SelectProtocol(SSL* /*connection*/, const unsigned char** chosen, unsigned char* length,
                   const unsigned char* offered, unsigned int size, void* /*data*/) {
  unsigned char* found = nullptr;
  if (SSL_select_next_proto(&found, length, kHttp11.data(), kHttp11.size(), offered, size) != OPENSSL_NPN_NEGOTIATED) {
    return SSL_TLSEXT_ERR_ALERT_FATAL;
  }
  *chosen = found;
  return SSL_TLSEXT_ERR_OK;
}

// Sessions are not resumed: connections live for many requests, and a ticket key that is kept for long would open the
// recorded connections of TLS 1.2.
bool SetRules(SSL_CTX* context) {
  SSL_CTX_set_options(context, SSL_OP_NO_RENEGOTIATION | SSL_OP_NO_COMPRESSION | SSL_OP_NO_TICKET |
                                   SSL_OP_CIPHER_SERVER_PREFERENCE | SSL_OP_PRIORITIZE_CHACHA);
  SSL_CTX_set_session_cache_mode(context, SSL_SESS_CACHE_OFF);
  SSL_CTX_set_mode(context,
                   SSL_MODE_ENABLE_PARTIAL_WRITE | SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER | SSL_MODE_RELEASE_BUFFERS);
  SSL_CTX_set_alpn_select_cb(context, SelectProtocol, nullptr);
  std::string groups = kGroups;  // the macro casts the pointer to one to char, and the list is only read
  return SSL_CTX_set_min_proto_version(context, TLS1_2_VERSION) == 1 && SSL_CTX_set_num_tickets(context, 0) == 1 &&
         SSL_CTX_set_cipher_list(context, kCiphers) == 1 && SSL_CTX_set1_groups_list(context, groups.data()) == 1;
}

std::string FingerprintOf(X509* certificate) {
  static constexpr char kDigits[] = "0123456789ABCDEF";
  std::array<unsigned char, EVP_MAX_MD_SIZE> digest{};
  unsigned int size = 0;
  X509_digest(certificate, EVP_sha256(), digest.data(), &size);
  std::string text;
  for (std::size_t i = 0; i < size; ++i) {
    if (i > 0) text += ':';
    text += kDigits[digest[i] >> 4];
    text += kDigits[digest[i] & 15];
  }
  return text;
}

std::time_t EndOf(X509* certificate) {
  std::tm end{};
  return ASN1_TIME_to_tm(X509_get0_notAfter(certificate), &end) == 1 ? timegm(&end) : 0;
}

// Adds all certificates of the text; the first is the server's own.
bool AddCertificates(SSL_CTX* context, std::string_view text, std::string* error) {
  const Bio reader = Reader(text);
  const Certificate own(PEM_read_bio_X509_AUX(reader.get(), nullptr, NoPassword, nullptr));
  if (!own || SSL_CTX_use_certificate(context, own.get()) != 1) {
    *error = "the certificate cannot be used: " + TakeReason();
    return false;
  }
  while (X509* issuer = PEM_read_bio_X509(reader.get(), nullptr, NoPassword, nullptr)) {
    if (SSL_CTX_add0_chain_cert(context, issuer) == 1) continue;
    X509_free(issuer);
    *error = "a certificate of the chain cannot be used: " + TakeReason();
    return false;
  }
  const bool at_end = ERR_GET_REASON(ERR_peek_last_error()) == PEM_R_NO_START_LINE;
  if (!at_end) *error = "a certificate of the chain cannot be read: " + TakeReason();
  ERR_clear_error();
  return at_end;
}

bool AddKey(SSL_CTX* context, std::string_view text, std::string* error) {
  const Bio reader = Reader(text);
  const Key key(PEM_read_bio_PrivateKey(reader.get(), nullptr, NoPassword, nullptr));
  if (!key) {
    const bool encrypted = text.find("ENCRYPTED") != std::string_view::npos;
    *error = encrypted ? "the key has a password; remove it with openssl-pkey(1)"
                       : "the key cannot be read: " + TakeReason();
    ERR_clear_error();
    return false;
  }
  if (SSL_CTX_use_PrivateKey(context, key.get()) == 1 && SSL_CTX_check_private_key(context) == 1) return true;
  *error = "the key does not belong to the certificate: " + TakeReason();
  return false;
}

}  // namespace

void FreeTlsConnection::operator()(ssl_st* connection) const { SSL_free(connection); }

std::shared_ptr<const TlsIdentity> TlsIdentity::Make(std::string_view certificates, std::string_view key,
                                                     std::string* error) {
  ERR_clear_error();
  const Context context(SSL_CTX_new(TLS_server_method()), SSL_CTX_free);
  if (!context || !SetRules(context.get())) {
    *error = "TLS cannot be set up: " + TakeReason();
    return nullptr;
  }
  if (!AddCertificates(context.get(), certificates, error) || !AddKey(context.get(), key, error)) return nullptr;
  X509* own = SSL_CTX_get0_certificate(context.get());
  return std::shared_ptr<const TlsIdentity>(new TlsIdentity(context, FingerprintOf(own), EndOf(own)));
}

bool TlsIdentity::Covers(const std::string& name) const {
  X509* own = SSL_CTX_get0_certificate(context_.get());
  return X509_check_host(own, name.data(), name.size(), 0, nullptr) == 1 ||
         X509_check_ip_asc(own, name.c_str(), 0) == 1;
}

TlsConnection TlsIdentity::NewConnection() const {
  TlsConnection connection(SSL_new(context_.get()));
  if (connection) SSL_set_accept_state(connection.get());
  return connection;
}

TlsIdentityPtr TlsServer::identity() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return identity_;
}

void TlsServer::Replace(TlsIdentityPtr identity) {
  const std::lock_guard<std::mutex> lock(mutex_);
  identity_ = std::move(identity);
}

std::string TlsServer::strict_transport() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return strict_transport_;
}

void TlsServer::SetStrictTransport(std::string value) {
  const std::lock_guard<std::mutex> lock(mutex_);
  strict_transport_ = std::move(value);
}

}  // namespace vorn::server

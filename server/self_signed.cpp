#include "self_signed.h"

#include <arpa/inet.h>
#include <ifaddrs.h>
#include <netinet/in.h>
#include <openssl/bio.h>
#include <openssl/ec.h>
#include <openssl/err.h>
#include <openssl/evp.h>
#include <openssl/pem.h>
#include <openssl/rand.h>
#include <openssl/x509.h>
#include <openssl/x509v3.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <climits>
#include <memory>

#include "openssl_objects.h"

namespace vorn::server {
namespace {

constexpr long kDay = 24L * 60 * 60;
constexpr std::size_t kLongestCommonName = 64;  // RFC 5280, appendix A: ub-common-name

bool IsAddress(const std::string& name) {
  in6_addr address{};
  return inet_pton(AF_INET, name.c_str(), &address) == 1 || inet_pton(AF_INET6, name.c_str(), &address) == 1;
}

std::string AlternativeNames(const std::vector<std::string>& names) {
  std::string text;
  for (const std::string& name : names) {
    text.append(text.empty() ? "" : ",").append(IsAddress(name) ? "IP:" : "DNS:").append(name);
  }
  return text;
}

// A positive number of 127 random bits (RFC 5280, 4.1.2.2).
bool SetSerial(X509* certificate) {
  std::array<unsigned char, 16> bytes{};
  if (RAND_bytes(bytes.data(), bytes.size()) != 1) return false;
  bytes[0] = static_cast<unsigned char>((bytes[0] & 0x7f) | 0x40);
  const Number number(BN_bin2bn(bytes.data(), bytes.size(), nullptr));
  return number && BN_to_ASN1_INTEGER(number.get(), X509_get_serialNumber(certificate)) != nullptr;
}

bool SetSubject(X509* certificate, const std::string& name) {
  const std::string common = name.substr(0, kLongestCommonName);
  X509_NAME* subject = X509_get_subject_name(certificate);
  return X509_NAME_add_entry_by_txt(subject, "CN", MBSTRING_UTF8, reinterpret_cast<const unsigned char*>(common.data()),
                                    static_cast<int>(common.size()), -1, 0) == 1 &&
         X509_set_issuer_name(certificate, subject) == 1;
}

bool AddExtension(X509* certificate, int kind, const std::string& value) {
  X509V3_CTX context{};
  X509V3_set_ctx(&context, certificate, certificate, nullptr, nullptr, 0);
  const Extension extension(X509V3_EXT_conf_nid(nullptr, &context, kind, value.c_str()));
  return extension && X509_add_ext(certificate, extension.get(), -1) == 1;
}

// A client may also trust the certificate as its own authority, which can issue no other one.
bool Fill(X509* certificate, EVP_PKEY* key, const std::vector<std::string>& names) {
  return X509_set_version(certificate, X509_VERSION_3) == 1 && SetSerial(certificate) &&
         X509_gmtime_adj(X509_getm_notBefore(certificate), -kDay) != nullptr &&
         X509_gmtime_adj(X509_getm_notAfter(certificate), (kSelfSignedDays - 1) * kDay) != nullptr &&
         X509_set_pubkey(certificate, key) == 1 && SetSubject(certificate, names.front()) &&
         AddExtension(certificate, NID_subject_alt_name, AlternativeNames(names)) &&
         AddExtension(certificate, NID_basic_constraints, "critical,CA:FALSE") &&
         AddExtension(certificate, NID_key_usage, "critical,digitalSignature") &&
         AddExtension(certificate, NID_ext_key_usage, "serverAuth") &&
         AddExtension(certificate, NID_subject_key_identifier, "hash") && X509_sign(certificate, key, EVP_sha256()) > 0;
}

std::string TextOf(BIO* bio) {
  char* data = nullptr;
  const long size = BIO_get_mem_data(bio, &data);
  return {data, static_cast<std::size_t>(size)};
}

void AddName(std::vector<std::string>* names, const std::string& name) {
  if (!name.empty() && std::find(names->begin(), names->end(), name) == names->end()) names->push_back(name);
}

std::string TextOf(const sockaddr* address) {
  char text[INET6_ADDRSTRLEN] = "";
  if (address != nullptr && address->sa_family == AF_INET) {
    inet_ntop(AF_INET, &reinterpret_cast<const sockaddr_in*>(address)->sin_addr, text, sizeof text);
  } else if (address != nullptr && address->sa_family == AF_INET6) {
    const in6_addr& ipv6 = reinterpret_cast<const sockaddr_in6*>(address)->sin6_addr;
    if (!IN6_IS_ADDR_LINKLOCAL(&ipv6)) inet_ntop(AF_INET6, &ipv6, text, sizeof text);
  }
  return text;
}

}  // namespace

std::optional<std::string> MakeSelfSigned(const std::vector<std::string>& names, std::string* error) {
  const Key key(EVP_PKEY_Q_keygen(nullptr, nullptr, "EC", "P-256"));
  const Certificate certificate(X509_new());
  const Bio text(BIO_new(BIO_s_mem()));
  if (key && certificate && text && Fill(certificate.get(), key.get(), names) &&
      PEM_write_bio_PrivateKey(text.get(), key.get(), nullptr, nullptr, 0, nullptr, nullptr) == 1 &&
      PEM_write_bio_X509(text.get(), certificate.get()) == 1) {
    return TextOf(text.get());
  }
  const char* reason = ERR_reason_error_string(ERR_peek_last_error());
  *error = std::string("no certificate can be made: ") + (reason == nullptr ? "no memory" : reason);
  ERR_clear_error();
  return std::nullopt;
}

std::vector<std::string> NamesOfThisMachine() {
  std::vector<std::string> names;
  char host[HOST_NAME_MAX + 1] = "";
  if (gethostname(host, sizeof host - 1) == 0) AddName(&names, host);
  AddName(&names, "localhost");
  ifaddrs* first = nullptr;
  if (getifaddrs(&first) != 0) return names;
  for (const ifaddrs* each = first; each != nullptr; each = each->ifa_next) AddName(&names, TextOf(each->ifa_addr));
  freeifaddrs(first);
  return names;
}

}  // namespace vorn::server

#include "certificate_findings.h"

#include <openssl/bio.h>
#include <openssl/pem.h>
#include <openssl/x509.h>

#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "ini_file.h"

namespace vorn {
namespace {

constexpr char kServerSettings[] = "/etc/vorn/vornd.conf";
constexpr char kSelfSigned[] = "/var/lib/vorn/self-signed.pem";
constexpr int kSoon = 30;            // days
constexpr int kSoonSelfSigned = 14;  // days; the server makes a new one 30 days before the end

struct Certificate {
  std::string file;
  bool is_self_signed = false;
};

// The certificate that the server uses; nullopt if it uses none.
Result<std::optional<Certificate>> CertificateOfServer(Box& box) {
  const Result<SharedIniFile> settings = IniFile::Open(box, kServerSettings);
  if (!settings.ok()) return settings.status();
  const IniDocument& document = (*settings)->document();
  const std::string file = document.Get("tls", "certificate").value_or("");
  if (!file.empty()) return std::optional(Certificate{file, false});
  const bool has_tls = (" " + document.Get("server", "listen").value_or("")).find(" tls:") != std::string::npos;
  return has_tls ? std::optional(Certificate{kSelfSigned, true}) : std::nullopt;
}

// Returns the days until the first certificate of a file in the PEM format expires, negative ones since then; nullopt
// if there is no certificate.
std::optional<int> DaysLeft(const std::string& text) {
  const std::unique_ptr<BIO, decltype(&BIO_free_all)> input(BIO_new_mem_buf(text.data(), static_cast<int>(text.size())),
                                                            BIO_free_all);
  if (!input) return std::nullopt;
  const std::unique_ptr<X509, decltype(&X509_free)> certificate(
      PEM_read_bio_X509(input.get(), nullptr, nullptr, nullptr), X509_free);
  int days = 0;
  int seconds = 0;
  if (!certificate || ASN1_TIME_diff(&days, &seconds, nullptr, X509_get0_notAfter(certificate.get())) != 1) {
    return std::nullopt;
  }
  return seconds < 0 ? days - 1 : days;
}

std::string InDays(int days) { return days == 1 ? "1 day" : std::to_string(days) + " days"; }

}  // namespace

Status FindExpiringCertificate(const HealthInput& input, Findings* findings) {
  const Result<std::optional<Certificate>> certificate = CertificateOfServer(input.box);
  if (!certificate.ok()) return certificate.status();
  if (!*certificate) return {};
  const auto& [file, is_self_signed] = **certificate;
  const Result<StoredFile> stored = input.box.Read(file);
  if (!stored.ok()) return stored.status();
  const std::optional<int> days = DaysLeft(stored->text);
  if (!days) return Status::Failure(kUnsupported, file + " has no certificate that can be read.");
  if (*days > (is_self_signed ? kSoonSelfSigned : kSoon)) return {};
  VORN::HealthSubject subject;
  subject.file = file;
  const std::string remedy = is_self_signed ? "Restart vornd, which makes another certificate, and read its log."
                                            : "Install a new certificate and run \"systemctl reload vornd\".";
  if (*days < 0) {
    findings->Error(std::move(subject),
                    "The certificate " + file + " has expired: browsers and programs refuse the web API over TLS.",
                    remedy);
  } else {
    findings->Warning(std::move(subject),
                      "The certificate " + file + " expires in " + InDays(*days) +
                          ": browsers and programs then refuse the web API over TLS.",
                      remedy);
  }
  return {};
}

}  // namespace vorn

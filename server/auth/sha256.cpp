#include "sha256.h"

#include <openssl/evp.h>

#include <new>

namespace vorn::server {
namespace {

const EVP_MD* Fetch() {
  const EVP_MD* const algorithm = EVP_MD_fetch(nullptr, "SHA256", nullptr);
  if (algorithm == nullptr) throw std::bad_alloc();
  return algorithm;
}

}  // namespace

// The algorithm is fetched once and never released: fetching it for each digest takes longer than the digest of a small
// answer.
Sha256Digest Sha256(std::string_view text) {
  static const EVP_MD* const algorithm = Fetch();
  Sha256Digest digest{};
  if (EVP_Digest(text.data(), text.size(), digest.data(), nullptr, algorithm, nullptr) != 1) throw std::bad_alloc();
  return digest;
}

}  // namespace vorn::server

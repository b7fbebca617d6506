#include "secret.h"

#include <openssl/crypto.h>
#include <sys/random.h>
#include <zlib.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstddef>
#include <cstdio>
#include <system_error>

#include "sha256.h"

namespace vorn::server {
namespace {

constexpr std::size_t kSecretBytes = 32;
constexpr std::size_t kIdBytes = 8;
constexpr std::size_t kChecksumDigits = 8;

template <typename Bytes>
std::string Hexadecimal(const Bytes& bytes) {
  constexpr std::string_view kDigits = "0123456789abcdef";
  std::string text;
  text.reserve(2 * bytes.size());
  for (const unsigned char byte : bytes) {
    text += kDigits[byte >> 4];
    text += kDigits[byte & 15];
  }
  return text;
}

// getrandom(2) returns up to 256 bytes whole.
template <std::size_t kBytes>
std::array<unsigned char, kBytes> RandomBytes() {
  std::array<unsigned char, kBytes> bytes{};
  if (getrandom(bytes.data(), bytes.size(), 0) != static_cast<ssize_t>(bytes.size())) {
    throw std::system_error(errno, std::generic_category(), "getrandom");
  }
  return bytes;
}

std::string ChecksumOf(std::string_view text) {
  const auto sum = crc32(0, reinterpret_cast<const Bytef*>(text.data()), static_cast<uInt>(text.size()));
  char digits[kChecksumDigits + 1];
  std::snprintf(digits, sizeof digits, "%08lx", sum);
  return digits;
}

bool IsHexadecimal(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f'); });
}

}  // namespace

std::string NewSecret(std::string_view prefix) {
  const std::string secret = std::string(prefix) + Hexadecimal(RandomBytes<kSecretBytes>());
  return secret + ChecksumOf(secret);
}

bool IsSecret(std::string_view text, std::string_view prefix) {
  if (text.size() != prefix.size() + 2 * kSecretBytes + kChecksumDigits) return false;
  if (text.substr(0, prefix.size()) != prefix || !IsHexadecimal(text.substr(prefix.size()))) return false;
  const std::string_view secret = text.substr(0, text.size() - kChecksumDigits);
  return text.substr(secret.size()) == ChecksumOf(secret);
}

bool ContainsSecret(std::string_view text) {
  constexpr std::size_t kDigits = 2 * kSecretBytes + kChecksumDigits;
  for (const std::string_view prefix : {kTokenPrefix, kSessionPrefix, kCodePrefix}) {
    for (std::size_t at = text.find(prefix); at != std::string_view::npos; at = text.find(prefix, at + 1)) {
      const std::string_view digits = text.substr(at + prefix.size(), kDigits);
      if (digits.size() == kDigits && IsHexadecimal(digits)) return true;
    }
  }
  return false;
}

std::string DigestOf(std::string_view secret) { return Hexadecimal(Sha256(secret)); }

std::string NewId() { return Hexadecimal(RandomBytes<kIdBytes>()); }

void Wipe(std::string* text) {
  OPENSSL_cleanse(text->data(), text->size());
  text->clear();
}

}  // namespace vorn::server

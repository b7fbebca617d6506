// SHA-256 (FIPS 180-4), by OpenSSL.
#ifndef VORN_SERVER_SHA256_H
#define VORN_SERVER_SHA256_H

#include <array>
#include <string_view>

namespace vorn::server {

using Sha256Digest = std::array<unsigned char, 32>;

// Thread-safe. Throws std::bad_alloc if there is no memory.
//
// The first call of a process loads the algorithm. OpenSSL can crash if it finds no memory while it is loading (its
// locks are null pointers then), so the server calls this once before it serves.
Sha256Digest Sha256(std::string_view text);

}  // namespace vorn::server

#endif  // VORN_SERVER_SHA256_H

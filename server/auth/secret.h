// Random secrets that identify a caller: tokens, sessions, one-time codes.
//
// A secret is a prefix, 256 bits from getrandom(2) in hexadecimal, and the CRC-32 of both in hexadecimal. The prefix
// and the checksum let secret scanners find a secret in files without false alarms:
//     vorn(s|c)?_[0-9a-f]{72}
#ifndef VORN_SERVER_SECRET_H
#define VORN_SERVER_SECRET_H

#include <string>
#include <string_view>

namespace vorn::server {

constexpr std::string_view kTokenPrefix = "vorn_";     // of a program
constexpr std::string_view kSessionPrefix = "vorns_";  // of a session
constexpr std::string_view kCodePrefix = "vornc_";     // a one-time sign-in code

// Throws std::system_error if there is no random source.
std::string NewSecret(std::string_view prefix);

// Returns whether the string has the form and the checksum of a secret with this prefix.
bool IsSecret(std::string_view text, std::string_view prefix);

// Returns whether a part of the text has the form of a secret with any of the prefixes, whatever its checksum.
bool ContainsSecret(std::string_view text);

// The SHA-256 digest in hexadecimal, which is stored instead of a secret. 256 random bits need no slower digest. A
// lookup by digest may take a time that depends on it: the digest does not lead to the secret.
std::string DigestOf(std::string_view secret);

// A short random name that is no secret, for lists.
std::string NewId();

// Overwrites the characters, so that a password does not remain in memory.
void Wipe(std::string* text);

}  // namespace vorn::server

#endif  // VORN_SERVER_SECRET_H

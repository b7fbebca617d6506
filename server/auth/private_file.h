// A small file that only the server's own user may read (mode 0600).
#ifndef VORN_SERVER_PRIVATE_FILE_H
#define VORN_SERVER_PRIVATE_FILE_H

#include <optional>
#include <string>
#include <string_view>

namespace vorn::server {

// Returns the content; an empty string if there is no file. Returns std::nullopt on failure, with the reason in
// `error`. A file that other users may read or write, or that is larger than 16 MiB, is refused.
std::optional<std::string> ReadPrivateFile(const std::string& path, std::string* error);

// Replaces the file in one step, durably: after a crash it has the old or the new content. Returns false on failure,
// with the reason in `error`; the old content is then still there.
bool ReplacePrivateFile(const std::string& path, std::string_view content, std::string* error);

}  // namespace vorn::server

#endif  // VORN_SERVER_PRIVATE_FILE_H

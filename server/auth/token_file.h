// The file format of the token store: a JSON document, {"tokens": [{"id": ..., "digest": ..., ...}]}.
#ifndef VORN_SERVER_TOKEN_FILE_H
#define VORN_SERVER_TOKEN_FILE_H

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "token_store.h"

namespace vorn::server {

using StoredTokens = std::vector<std::pair<std::string, Token>>;  // a digest and its token

std::string FormatTokens(const StoredTokens& tokens);

// Empty text is a file without tokens. Returns std::nullopt for anything that FormatTokens() does not write, with the
// reason in `error`: a restriction that is misread would be a right that nobody gave.
std::optional<StoredTokens> ParseTokens(const std::string& text, std::string* error);

}  // namespace vorn::server

#endif  // VORN_SERVER_TOKEN_FILE_H

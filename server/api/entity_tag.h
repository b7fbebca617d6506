// Entity tags (RFC 9110, 8.8.3) of the answers of reading methods.
//
// A tag has a digest of the answer's data and the parameters of the call, so that the server can read the same data
// again when a client sends the tag with If-Match: "DIGEST" or "DIGEST.PARAMETERS". Clients compare tags as a whole.
#ifndef VORN_SERVER_ENTITY_TAG_H
#define VORN_SERVER_ENTITY_TAG_H

#include <json/value.h>

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace vorn::server {

// The largest size, in bytes, of the JSON text of the parameters that a tag has.
constexpr std::size_t kMaxTaggedParameters = 1024;

// Returns the form of a call's parameters that a tag has: their JSON text, or an empty string if there are none;
// std::nullopt if they are larger than kMaxTaggedParameters. Throws std::bad_alloc, as MakeEntityTag() does.
std::optional<std::string> TaggedParameters(const Json::Value& parameters);

// Returns the tag, with its quotation marks, of an answer with this data (JSON text) to a call with these tagged
// parameters.
std::string EntityTagOf(std::string_view tagged_parameters, std::string_view data);

// Returns the tag, with its quotation marks, of an answer with this data (JSON text) to a call with these parameters;
// std::nullopt if the parameters are larger than kMaxTaggedParameters. Throws std::bad_alloc.
std::optional<std::string> MakeEntityTag(const Json::Value& parameters, std::string_view data);

// Returns the parameters in a tag; std::nullopt for a text that is not such a tag.
std::optional<Json::Value> ParametersOfTag(std::string_view tag);

// The value of an If-Match header (RFC 9110, 13.1.1).
struct IfMatch {
  bool any = false;               // "*"
  std::vector<std::string> tags;  // strong ones, as MakeEntityTag returns them; a weak one never matches
};

// At most `kMaxTags` tags are read.
constexpr std::size_t kMaxTags = 8;
IfMatch ParseIfMatch(std::string_view value);

}  // namespace vorn::server

#endif  // VORN_SERVER_ENTITY_TAG_H

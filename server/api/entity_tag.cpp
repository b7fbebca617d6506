#include "entity_tag.h"

#include <openssl/evp.h>

#include <utility>

#include "answer.h"
#include "header_value.h"
#include "json_input.h"
#include "response_writer.h"
#include "sha256.h"

namespace vorn::server {
namespace {

std::string Base64(std::string_view bytes) {
  std::string text(4 * ((bytes.size() + 2) / 3) + 1, '\0');  // with the null that OpenSSL writes
  const int size =
      EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()),
                      reinterpret_cast<const unsigned char*>(bytes.data()), static_cast<int>(bytes.size()));
  text.resize(static_cast<std::size_t>(size));
  return text;
}

// std::nullopt for a text that is not Base64 with padding (RFC 4648, 4).
std::optional<std::string> FromBase64(std::string_view text) {
  std::string bytes(text.size(), '\0');
  const int size = EVP_DecodeBlock(reinterpret_cast<unsigned char*>(bytes.data()),
                                   reinterpret_cast<const unsigned char*>(text.data()), static_cast<int>(text.size()));
  if (size < 0) return std::nullopt;
  bytes.resize(static_cast<std::size_t>(size));
  // OpenSSL decodes the padding as zeros.
  while (!text.empty() && text.back() == '=' && !bytes.empty()) {
    text.remove_suffix(1);
    bytes.pop_back();
  }
  return bytes;
}

std::string Digest(std::string_view text) {
  const Sha256Digest digest = Sha256(text);
  return Base64({reinterpret_cast<const char*>(digest.data()), digest.size()});
}

}  // namespace

std::optional<std::string> TaggedParameters(const Json::Value& parameters) {
  std::optional<std::string> text(std::in_place);
  if (!parameters.empty()) text = WriteJson(parameters);
  if (text->size() > kMaxTaggedParameters) text.reset();
  return text;
}

std::string EntityTagOf(std::string_view tagged_parameters, std::string_view data) {
  std::string tag = '"' + Digest(data);
  if (!tagged_parameters.empty()) tag += '.' + Base64(tagged_parameters);
  return tag + '"';
}

std::optional<std::string> MakeEntityTag(const Json::Value& parameters, std::string_view data) {
  const std::optional<std::string> tagged = TaggedParameters(parameters);
  return tagged ? std::optional(EntityTagOf(*tagged, data)) : std::nullopt;
}

std::optional<Json::Value> ParametersOfTag(std::string_view tag) {
  if (tag.size() < 2 || tag.front() != '"' || tag.back() != '"') return std::nullopt;
  tag = tag.substr(1, tag.size() - 2);
  const std::size_t dot = tag.find('.');
  if (dot == std::string_view::npos) return Json::Value(Json::objectValue);
  const std::optional<std::string> text = FromBase64(tag.substr(dot + 1));
  std::string error;
  return text && text->size() <= kMaxTaggedParameters ? ParseJsonObject(*text, &error) : std::nullopt;
}

IfMatch ParseIfMatch(std::string_view value) {
  IfMatch condition;
  condition.any = TrimBlanks(value) == "*";
  ForEachElement(value, [&condition](std::string_view tag) {
    if (tag.front() == '"' && condition.tags.size() < kMaxTags) condition.tags.push_back(UncodedTag(tag));
  });
  return condition;
}

}  // namespace vorn::server

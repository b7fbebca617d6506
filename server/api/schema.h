// The part of JSON Schema (draft 2020-12, the dialect of OpenAPI 3.1) in which descriptors describe parameters.
//
//   checked:      type, enum, const, minimum, maximum, minLength (1 only), pattern ("^[^...]*$" only), required,
//                 properties, items, anyOf, if, then, else, $ref ("#/components/schemas/NAME" only)
//   not checked:  title, description, default, examples, contentMediaType,
//                 writeOnly
//   x-reason:     the end of the sentence about a value that matches no schema of "anyOf"; required beside it
//
// A member that is null counts as absent.
#ifndef VORN_SERVER_SCHEMA_H
#define VORN_SERVER_SCHEMA_H

#include <json/value.h>

#include <string>
#include <vector>

namespace vorn::server {

// The named schemas of a descriptor ("components", "schemas"). Immutable, so any thread may use it.
class Schemas {
 public:
  static constexpr std::size_t kMostFaults = 8;

  // `named` is an object, or null for no schemas.
  explicit Schemas(Json::Value named = Json::objectValue);

  // Returns whether `schema`, and each schema that it refers to, uses only the keywords above and uses them properly.
  // Otherwise `error` has the reason.
  bool Support(const Json::Value& schema, std::string* error) const;

  // Returns a sentence for each member of `parameters` that does not match, for example
  //     "rule[0].async" must be a boolean, not a string.
  // and an empty list if all match; no more than kMostFaults. The schema must be supported.
  std::vector<std::string> Faults(const Json::Value& parameters, const Json::Value& schema) const;

  // Returns the schema that the value of a "$ref" names; nullptr if there is none of that name.
  const Json::Value* Target(const Json::Value& reference) const;

  const Json::Value& named() const { return named_; }

 private:
  Json::Value named_;
};

}  // namespace vorn::server

#endif  // VORN_SERVER_SCHEMA_H

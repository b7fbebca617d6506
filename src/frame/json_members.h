// Members of a JSON object that are found together.
#ifndef VORN_SRC_JSON_MEMBERS_H
#define VORN_SRC_JSON_MEMBERS_H

#include <json/value.h>

#include <string_view>

// Stores the member of each name of [first, last) in `members`, and the null value for a name without a member, as
// Json::Value::operator[] does. The names differ from each other. The members belong to `object` and are valid until
// it changes. One walk over a request with few members costs less than a lookup of each name. Throws Json::LogicError
// if `object` is neither an object nor null. Thread-safe for different `members`.
void FindMembers(const Json::Value& object, const std::string_view* first, const std::string_view* last,
                 const Json::Value** members);

#endif  // VORN_SRC_JSON_MEMBERS_H

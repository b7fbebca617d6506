#include "json_members.h"

#include <algorithm>
#include <cstddef>

namespace {

std::string_view NameOf(const Json::Value::const_iterator& member) {
  const char* end = nullptr;
  const char* const begin = member.memberName(&end);
  return {begin, static_cast<std::size_t>(end - begin)};
}

}  // namespace

void FindMembers(const Json::Value& object, const std::string_view* first, const std::string_view* last,
                 const Json::Value** members) {
  if (!object.isObject() && !object.isNull()) throw Json::LogicError("A value without members.");
  std::fill_n(members, last - first, &Json::Value::nullSingleton());
  const Json::Value::const_iterator end = object.end();
  for (Json::Value::const_iterator member = object.begin(); member != end; ++member) {
    const std::string_view* const name = std::find(first, last, NameOf(member));
    if (name != last) members[name - first] = &*member;
  }
}

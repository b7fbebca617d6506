#include "schema.h"

#include <algorithm>
#include <cstddef>
#include <initializer_list>
#include <iterator>
#include <string_view>
#include <utility>

namespace vorn::server {
namespace {

constexpr std::string_view kReference = "#/components/schemas/";
constexpr int kMaxNesting = 32;  // of schemas and references; a schema that refers to itself exceeds it

// A pattern names the characters that a string must not contain.
constexpr std::string_view kPatternBegin = "^[^";
constexpr std::string_view kPatternEnd = "]*$";

std::string Quoted(std::string_view text) { return '"' + std::string(text) + '"'; }

// Returns the schema that `schema` refers to, or nullptr if there is none of that name.
const Json::Value* Target(const Json::Value& named, const Json::Value& reference) {
  const std::string path = reference.isString() ? reference.asString() : "";
  if (path.compare(0, kReference.size(), kReference) != 0) return nullptr;
  return named.find(path.data() + kReference.size(), path.data() + path.size());
}

// ------------------------------------------------------------------------------------- supported schemas

constexpr std::string_view kTypes[] = {"null", "boolean", "integer", "number", "string", "array", "object"};

bool IsType(const Json::Value& value) {
  return value.isString() && std::find(std::begin(kTypes), std::end(kTypes), value.asString()) != std::end(kTypes);
}
bool IsListOf(const Json::Value& list, bool (*is_item)(const Json::Value&)) {
  return list.isArray() && !list.empty() && std::all_of(list.begin(), list.end(), is_item);
}
bool IsBool(const Json::Value& value) { return value.isBool(); }
bool IsText(const Json::Value& value) { return value.isString(); }
bool IsAnything(const Json::Value& /*value*/) { return true; }
bool IsScalar(const Json::Value& value) { return !value.isArray() && !value.isObject(); }
bool IsTypeOrTypes(const Json::Value& value) { return IsType(value) || IsListOf(value, IsType); }
bool IsList(const Json::Value& value) { return IsListOf(value, IsAnything); }
bool IsListOfScalars(const Json::Value& value) { return IsListOf(value, IsScalar); }
bool IsListOfTexts(const Json::Value& value) { return IsListOf(value, IsText); }
bool IsNumber(const Json::Value& value) { return value.isNumeric(); }
bool IsOne(const Json::Value& value) { return value == Json::Value(1); }
bool IsSchema(const Json::Value& value) { return value.isObject(); }
bool IsListOfSchemas(const Json::Value& value) { return IsListOf(value, IsSchema); }
bool IsObjectOfSchemas(const Json::Value& value) {
  return value.isObject() && std::all_of(value.begin(), value.end(), IsSchema);
}

// Returns the characters that a pattern excludes; empty if the pattern has another form.
std::string_view ExcludedBy(std::string_view pattern) {
  if (pattern.size() <= kPatternBegin.size() + kPatternEnd.size()) return "";
  if (pattern.substr(0, kPatternBegin.size()) != kPatternBegin) return "";
  pattern.remove_prefix(kPatternBegin.size());
  if (pattern.substr(pattern.size() - kPatternEnd.size()) != kPatternEnd) return "";
  pattern.remove_suffix(kPatternEnd.size());
  // These would have a meaning of their own inside the brackets.
  return pattern.find_first_of("[]\\^-") == std::string_view::npos ? pattern : "";
}
bool IsPattern(const Json::Value& value) { return value.isString() && !ExcludedBy(value.asString()).empty(); }

struct Keyword {
  std::string_view name;
  bool (*accepts)(const Json::Value& value);
};

constexpr Keyword kKeywords[] = {
    {"$ref", IsText},
    {"type", IsTypeOrTypes},
    {"enum", IsListOfScalars},
    {"const", IsScalar},
    {"minimum", IsNumber},
    {"maximum", IsNumber},
    {"minLength", IsOne},
    {"pattern", IsPattern},
    {"required", IsListOfTexts},
    {"properties", IsObjectOfSchemas},
    {"items", IsSchema},
    {"anyOf", IsListOfSchemas},
    {"if", IsSchema},
    {"then", IsSchema},
    {"else", IsSchema},
    {"title", IsText},
    {"description", IsText},
    {"default", IsAnything},
    {"examples", IsList},
    {"contentMediaType", IsText},
    {"writeOnly", IsBool},
    {"x-reason", IsText},
};

// Checks one schema and those inside it.
class SupportCheck {
 public:
  SupportCheck(const Json::Value& named, std::string* error) : named_(named), error_(error) {}

  bool Check(const Json::Value& schema, int depth) {
    if (!schema.isObject()) return Fail("a schema is not an object");
    if (depth > kMaxNesting) return Fail("schemas are nested too deeply, or a schema refers to itself");
    for (auto member = schema.begin(); member != schema.end(); ++member) {
      if (!CheckKeyword(member.name(), *member)) return false;
    }
    if (schema.isMember("anyOf") && !schema.isMember("x-reason")) return Fail("\"anyOf\" needs an \"x-reason\"");
    return CheckInner(schema, depth + 1);
  }

 private:
  bool Fail(std::string reason) {
    *error_ = std::move(reason);
    return false;
  }

  bool CheckKeyword(const std::string& name, const Json::Value& value) {
    const auto* keyword = std::find_if(std::begin(kKeywords), std::end(kKeywords),
                                       [&name](const Keyword& each) { return each.name == name; });
    if (keyword == std::end(kKeywords)) return Fail("the schema keyword " + Quoted(name) + " is not supported");
    if (!keyword->accepts(value)) return Fail("the schema keyword " + Quoted(name) + " has an unsupported value");
    return true;
  }

  bool CheckInner(const Json::Value& schema, int depth) {
    if (schema.isMember("$ref")) {
      const Json::Value* target = Target(named_, schema["$ref"]);
      if (target == nullptr) return Fail("there is no schema " + Quoted(schema["$ref"].asString()));
      if (!Check(*target, depth)) return false;
    }
    for (const char* keyword : {"items", "if", "then", "else"}) {
      if (schema.isMember(keyword) && !Check(schema[keyword], depth)) return false;
    }
    const auto check = [this, depth](const Json::Value& inner) { return Check(inner, depth); };
    return std::all_of(schema["properties"].begin(), schema["properties"].end(), check) &&
           std::all_of(schema["anyOf"].begin(), schema["anyOf"].end(), check);
  }

  const Json::Value& named_;
  std::string* error_;
};

// ------------------------------------------------------------------------------------- values

// Returns the type of a value. As in JSON Schema, 1.0 is an integer.
std::string_view TypeOf(const Json::Value& value) {
  if (value.isNull()) return "null";
  if (value.isBool()) return "boolean";
  if (value.isNumeric()) return value.isIntegral() ? "integer" : "number";
  if (value.isString()) return "string";
  return value.isArray() ? "array" : "object";
}

std::string WithArticle(std::string_view type) {
  if (type == "null") return "null";
  const bool begins_with_vowel = std::string_view("aeiou").find(type.front()) != std::string_view::npos;
  return (begins_with_vowel ? "an " : "a ") + std::string(type);
}

bool HasType(const Json::Value& value, const Json::Value& type) {
  return type == TypeOf(value).data() || (type == "number" && value.isNumeric());
}

// `value` is not an array or an object.
std::string Text(const Json::Value& value) { return value.isString() ? Quoted(value.asString()) : value.asString(); }

// Joins with commas and a last "or".
std::string Alternatives(const std::vector<std::string>& words) {
  std::string text;
  for (std::size_t i = 0; i < words.size(); ++i) {
    if (i > 0) text += i + 1 == words.size() ? " or " : ", ";
    text += words[i];
  }
  return text;
}

// Compares values with schemas, and collects the faults.
class Comparison {
 public:
  Comparison(const Json::Value& named, std::size_t most) : named_(named), most_(most) {}

  // `name` is the path of the value, for the sentences; empty for the whole object.
  void Match(const Json::Value& value, const Json::Value& schema, const std::string& name) {
    if (faults_.size() >= most_) return;
    if (schema.isMember("$ref")) Match(value, *Target(named_, schema["$ref"]), name);
    // The other keywords would only repeat that the type is wrong.
    if (!MatchType(value, schema["type"], name)) return;
    MatchValue(value, schema, name);
    if (value.isString()) MatchString(value.asString(), schema, name);
    if (value.isArray()) MatchItems(value, schema["items"], name);
    if (value.isObject()) MatchMembers(value, schema, name);
    MatchConditions(value, schema, name);
  }

  std::vector<std::string> TakeFaults() { return std::move(faults_); }

 private:
  void Fault(const std::string& name, const std::string& text) {
    if (faults_.size() < most_)
      faults_.push_back((name.empty() ? "The parameter object" : Quoted(name)) + " " + text + ".");
  }

  bool MatchType(const Json::Value& value, const Json::Value& types, const std::string& name) {
    if (types.isNull()) return true;
    if (types.isString() && HasType(value, types)) return true;
    if (std::any_of(types.begin(), types.end(), [&value](const Json::Value& type) { return HasType(value, type); })) {
      return true;
    }
    std::vector<std::string> accepted;
    if (types.isString()) accepted.push_back(WithArticle(types.asString()));
    for (const Json::Value& type : types) {
      if (type != "null") accepted.push_back(WithArticle(type.asString()));
    }
    Fault(name, "must be " + Alternatives(accepted) + ", not " + WithArticle(TypeOf(value)));
    return false;
  }

  void MatchValue(const Json::Value& value, const Json::Value& schema, const std::string& name) {
    const Json::Value& accepted = schema["enum"];
    if (!accepted.isNull() && std::find(accepted.begin(), accepted.end(), value) == accepted.end()) {
      std::vector<std::string> words;
      std::transform(accepted.begin(), accepted.end(), std::back_inserter(words), Text);
      Fault(name, "must be " + Alternatives(words));
    }
    if (schema.isMember("const") && schema["const"] != value) Fault(name, "must be " + Text(schema["const"]));
    if (!value.isNumeric()) return;
    const Json::Value& minimum = schema["minimum"];
    const Json::Value& maximum = schema["maximum"];
    if (!minimum.isNull() && value.asDouble() < minimum.asDouble()) Fault(name, "must be at least " + Text(minimum));
    if (!maximum.isNull() && value.asDouble() > maximum.asDouble()) Fault(name, "must be at most " + Text(maximum));
  }

  void MatchString(const std::string& text, const Json::Value& schema, const std::string& name) {
    if (schema.isMember("minLength") && text.empty()) Fault(name, "must not be empty");
    const std::string pattern = schema["pattern"].asString();
    const std::string excluded(ExcludedBy(pattern));
    if (text.find_first_of(excluded) != std::string::npos) {
      Fault(name, "must not contain any of the characters in [" + excluded + "]");
    }
  }

  void MatchItems(const Json::Value& array, const Json::Value& schema, const std::string& name) {
    if (schema.isNull()) return;
    for (Json::ArrayIndex i = 0; i < array.size() && faults_.size() < most_; ++i) {
      Match(array[i], schema, name + "[" + std::to_string(i) + "]");
    }
  }

  void MatchMembers(const Json::Value& object, const Json::Value& schema, const std::string& name) {
    const std::string prefix = name.empty() ? "" : name + ".";
    for (const Json::Value& key : schema["required"]) {
      if (object[key.asString()].isNull()) Fault(prefix + key.asString(), "is missing");
    }
    const Json::Value& properties = schema["properties"];
    for (auto property = properties.begin(); property != properties.end(); ++property) {
      const Json::Value& member = object[property.name()];
      if (!member.isNull()) Match(member, *property, prefix + property.name());
    }
  }

  bool Matches(const Json::Value& value, const Json::Value& schema) const {
    Comparison comparison(named_, 1);
    comparison.Match(value, schema, "");
    return comparison.faults_.empty();
  }

  void MatchConditions(const Json::Value& value, const Json::Value& schema, const std::string& name) {
    const Json::Value& any_of = schema["anyOf"];
    const auto matches = [&](const Json::Value& each) { return Matches(value, each); };
    if (!any_of.isNull() && std::none_of(any_of.begin(), any_of.end(), matches)) {
      Fault(name, schema["x-reason"].asString());
    }
    if (!schema.isMember("if")) return;
    const char* const branch = Matches(value, schema["if"]) ? "then" : "else";
    if (schema.isMember(branch)) Match(value, schema[branch], name);
  }

  const Json::Value& named_;
  const std::size_t most_;
  std::vector<std::string> faults_;
};

}  // namespace

Schemas::Schemas(Json::Value named) : named_(std::move(named)) {}

const Json::Value* Schemas::Target(const Json::Value& reference) const { return server::Target(named_, reference); }

bool Schemas::Support(const Json::Value& schema, std::string* error) const {
  return SupportCheck(named_, error).Check(schema, 0);
}

std::vector<std::string> Schemas::Faults(const Json::Value& parameters, const Json::Value& schema) const {
  Comparison comparison(named_, kMostFaults);
  comparison.Match(parameters, schema, "");
  return comparison.TakeFaults();
}

}  // namespace vorn::server

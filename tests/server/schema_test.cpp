#include "schema.h"

#include <gmock/gmock.h>

#include "json_input.h"

namespace vorn::server {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

Json::Value Parse(const std::string& json) {
  std::string error;
  const auto value = ParseJsonObject(json, &error);
  EXPECT_TRUE(value) << json << ": " << error;
  return value.value_or(Json::Value());
}

std::vector<std::string> Faults(const std::string& schema, const std::string& parameters) {
  const Schemas schemas(Parse(R"({"Size": {"type": "integer", "minimum": 0, "maximum": 10}})"));
  std::string error;
  EXPECT_TRUE(schemas.Support(Parse(schema), &error)) << error;
  return schemas.Faults(Parse(parameters), Parse(schema));
}

// One property "a" with this schema.
std::string OfA(const std::string& schema) { return R"({"type": "object", "properties": {"a": )" + schema + "}}"; }

TEST(Schema, NamesTheParameterAndTheFault) {
  const struct {
    const char* schema;  // of "a"
    const char* value;   // of "a"
    const char* fault;   // what follows "a"
  } cases[] = {
      {R"({"type": "boolean"})", "\"true\"", "must be a boolean, not a string."},
      {R"({"type": "boolean"})", "1", "must be a boolean, not an integer."},
      {R"({"type": ["integer", "null"]})", "1.5", "must be an integer, not a number."},
      {R"({"type": ["integer", "null"]})", "1e300", "must be an integer, not a number."},
      {R"({"type": ["string", "integer", "array"]})", "{}", "must be a string, an integer or an array, not an object."},
      {R"({"type": "number"})", "[]", "must be a number, not an array."},
      {R"({"type": "integer", "minimum": -1})", "-2", "must be at least -1."},
      {R"({"type": "integer", "maximum": 2147483647})", "2147483648", "must be at most 2147483647."},
      {R"({"$ref": "#/components/schemas/Size"})", "11", "must be at most 10."},
      {R"({"enum": ["rw", "ro"]})", "\"RW\"", "must be \"rw\" or \"ro\"."},
      {R"({"enum": ["rw", "ro"]})", "1", "must be \"rw\" or \"ro\"."},
      {R"({"const": true})", "false", "must be true."},
      {R"({"type": "string", "minLength": 1})", "\"\"", "must not be empty."},
      {R"({"type": "string", "pattern": "^[^=]*$"})", "\"a=b\"", "must not contain any of the characters in [=]."},
  };
  for (const auto& c : cases) {
    EXPECT_THAT(Faults(OfA(c.schema), R"({"a": )" + std::string(c.value) + "}"),
                ElementsAre("\"a\" " + std::string(c.fault)))
        << c.schema;
  }
}

TEST(Schema, AcceptsWhatMatches) {
  const struct {
    const char* schema;
    const char* value;
  } cases[] = {
      {R"({"type": "integer", "minimum": 1, "maximum": 1})", "1.0"},
      {R"({"type": "number"})", "1"},
      {R"({"type": "boolean"})", "null"},
      {R"({"type": "string", "minLength": 1, "pattern": "^[^()|= '\"]*$"})", "\"10.0.0.0/24\""},
      {R"({"type": ["string", "array"], "items": {"type": "string"}})", R"(["a", "b"])"},
      {R"({"enum": ["rw", "ro"]})", "\"ro\""},
      {R"({"description": "any"})", "[[1]]"},
  };
  for (const auto& c : cases) {
    EXPECT_THAT(Faults(OfA(c.schema), R"({"a": )" + std::string(c.value) + "}"), IsEmpty()) << c.schema;
  }
}

TEST(Schema, CountsNullAsAbsent) {
  EXPECT_THAT(Faults(R"({"required": ["a", "b", "c"]})", R"({"a": null, "c": false})"),
              ElementsAre("\"a\" is missing.", "\"b\" is missing."));
}

TEST(Schema, NamesMembersOfArraysAndObjects) {
  const std::string schema = OfA(R"({"type": "array", "items": {"type": "object", "required": ["b"], "properties": {
      "c": {"type": "object", "properties": {"d": {"type": "boolean"}}}}}})");
  EXPECT_THAT(Faults(schema, R"({"a": [{"b": 1}, {"c": {"d": 1}}, null]})"),
              ElementsAre("\"a[1].b\" is missing.", "\"a[1].c.d\" must be a boolean, not an integer.",
                          "\"a[2]\" must be an object, not null."));
}

TEST(Schema, FollowsConditions) {
  const std::string schema = R"({"if": {"properties": {"on": {"const": true}}, "required": ["on"]},
      "then": {"required": ["port"]}, "else": {"properties": {"port": {"type": "string"}}}})";
  EXPECT_THAT(Faults(schema, R"({"on": true})"), ElementsAre("\"port\" is missing."));
  EXPECT_THAT(Faults(schema, R"({"on": true, "port": 1})"), IsEmpty());
  EXPECT_THAT(Faults(schema, R"({"on": false})"), IsEmpty());
  EXPECT_THAT(Faults(schema, R"({"port": 1})"), ElementsAre("\"port\" must be a string, not an integer."));
}

TEST(Schema, HasAReasonForAlternatives) {
  const std::string schema =
      OfA(R"({"x-reason": "needs b or c", "anyOf": [{"required": ["b"]}, {"required": ["c"]}]})");
  EXPECT_THAT(Faults(schema, R"({"a": {}})"), ElementsAre("\"a\" needs b or c."));
  EXPECT_THAT(Faults(schema, R"({"a": {"c": 1}})"), IsEmpty());
}

TEST(Schema, TellsOfTheWholeObject) {
  EXPECT_THAT(Faults(R"({"x-reason": "needs b", "anyOf": [{"required": ["b"]}]})", "{}"),
              ElementsAre("The parameter object needs b."));
}

TEST(Schema, EndsAfterAFewFaults) {
  std::string array = "[1";
  for (int i = 0; i < 1000; ++i) array += ",1";
  EXPECT_THAT(Faults(OfA(R"({"items": {"type": "string"}})"), R"({"a": )" + array + "]}"),
              SizeIs(Schemas::kMostFaults));
}

TEST(Schema, IsRefusedWithWhatIsNotSupported) {
  const Schemas schemas(Parse(R"({"Loop": {"properties": {"a": {"$ref": "#/components/schemas/Loop"}}}})"));
  for (const char* schema : {R"({"maxLength": 3})",
                             R"({"additionalProperties": false})",
                             R"({"type": "text"})",
                             R"({"type": []})",
                             R"({"enum": []})",
                             R"({"enum": [[1]]})",
                             R"({"const": {}})",
                             R"({"minimum": "1"})",
                             R"({"minLength": 2})",
                             R"({"pattern": "^[a-z]*$"})",
                             R"({"pattern": "^[^a-z]*$"})",
                             R"({"pattern": "^[^]*$"})",
                             R"({"required": "a"})",
                             R"({"properties": []})",
                             R"({"properties": {"a": true}})",
                             R"({"items": true})",
                             R"({"items": {"not": {}}})",
                             R"({"anyOf": [{}]})",
                             R"({"anyOf": [{"oneOf": []}], "x-reason": "x"})",
                             R"({"if": {"x": 1}})",
                             R"({"then": {"x": 1}})",
                             R"({"else": {"x": 1}})",
                             R"({"$ref": "#/components/schemas/None"})",
                             R"({"$ref": "other.json"})",
                             R"({"$ref": "#/components/schemas/Loop"})",
                             R"({"properties": {"a": {"properties": {"b": {"x": 1}}}}})"}) {
    std::string error;
    EXPECT_FALSE(schemas.Support(Parse(schema), &error)) << schema;
    EXPECT_NE(error, "") << schema;
  }
}

}  // namespace
}  // namespace vorn::server

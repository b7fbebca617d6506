#include "json_input.h"

#include <gtest/gtest.h>
#include <malloc.h>

#include <string>

namespace vorn::server {
namespace {

using std::string_literals::operator""s;

TEST(JsonInput, ReadsObjects) {
  std::string error;
  const auto value =
      ParseJsonObject(R"( {"a": [1, -2.5e3, true, null], "\u00e9\ud83d\ude00": "ü\n\"\\\/", "0": -0} )", &error);
  ASSERT_TRUE(value) << error;
  EXPECT_EQ((*value)["a"][0], 1);
  EXPECT_EQ((*value)["a"][1], -2500.0);
  EXPECT_EQ((*value)["é😀"], "ü\n\"\\/");
}

TEST(JsonInput, AllowsItsDepthAndNoMore) {
  const auto nested = [](int depth) {
    return R"({"a":)" + std::string(static_cast<std::size_t>(depth - 1), '[') +
           std::string(static_cast<std::size_t>(depth - 1), ']') + "}";
  };
  std::string error;
  EXPECT_TRUE(ParseJsonObject(nested(kMaxJsonDepth), &error)) << error;
  EXPECT_FALSE(ParseJsonObject(nested(kMaxJsonDepth + 1), &error));
  EXPECT_EQ(error, "Line 1, Column 69: nested too deep");
  EXPECT_FALSE(ParseJsonObject(nested(300000), &error));
}

struct RefusedInput {
  const char* name;
  std::string text;
  const char* error;  // the beginning of the error message
};

const RefusedInput kRefusedInputs[] = {
    {"nothing", "", "Line 1, Column 1: "},
    {"only blanks", "  \n ", "Line 2, Column 2: "},
    {"an array", "[]", "Line 1, Column 1: one JSON object is expected"},
    {"a text", "\"a\"", "Line 1, Column 1"},
    {"unclosed", "{\"a\":1", "Line 1, Column "},
    {"unclosed text", "{\"a", "Line 1, Column "},
    {"trailing bytes", "{} 1", "Line 1, Column 4: "},
    {"a second value", "{}{}", "Line 1, Column 3: "},
    {"trailing NUL", "{}\0"s, "Line 1, Column 3: unexpected character"},
    {"duplicate key", "{\"a\":1,\n \"a\":2}", "Line 2, Column 2: Duplicate key: 'a'"},
    {"duplicate key, one escaped", R"({"a":1,"\u0061":2})", "Line 1, Column 8: Duplicate key: 'a'"},
    {"duplicate key inside", R"({"x":{"a":1,"a":2}})", "Line 1, Column 13: Duplicate key: 'a'"},
    {"escaped NUL", R"({"a":"x\u0000y"})", "Line 1, Column 8: U+0000 in a text"},
    {"escaped NUL in a key", R"({"\u0000":1})", "Line 1, Column 3: U+0000 in a text"},
    {"raw NUL", "{\"a\":\"\0\"}"s, "Line 1, Column 7: control character in a text"},
    {"raw line break", "{\"a\":\"\n\"}", "Line 1, Column 7: control character in a text"},
    {"invalid UTF-8", "{\"a\":\"\xff\"}", "Line 1, Column 7: not UTF-8"},
    {"overlong UTF-8", "{\"a\":\"\xc0\x80\"}", "Line 1, Column 7: not UTF-8"},
    {"surrogate in UTF-8", "{\"a\":\"\xed\xa0\x80\"}", "Line 1, Column 7: not UTF-8"},
    {"cut UTF-8", "{}\xe2\x82", "Line 1, Column 3: not UTF-8"},
    {"byte order mark", "\xef\xbb\xbf{}", "Line 1, Column 1: "},
    {"high surrogate alone", R"({"a":"\ud800"})", "Line 1, Column 7: half a surrogate pair in a text"},
    {"high surrogate twice", R"({"a":"\ud800\ud800"})", "Line 1, Column 7: half a surrogate pair in a text"},
    {"low surrogate alone", R"({"a":"\udc00"})", "Line 1, Column 7: half a surrogate pair in a text"},
    {"short escape", R"({"a":"\u12"})", "Line 1, Column 7: \\u takes four hexadecimal digits"},
    {"short escape at the end", R"({"a":"\u12)", "Line 1, Column 7: \\u takes four hexadecimal digits"},
    {"unknown escape", R"({"a":"\x41"})", "Line 1, Column 7: unknown escape in a text"},
    {"escape at the end", R"({"a":"\)", "Line 1, Column 7: unknown escape in a text"},
    {"leading zero", R"({"a":01})", "Line 1, Column 6: a number begins with 0"},
    {"minus alone", R"({"a":-})", "Line 1, Column 6: not a number"},
    {"plus", R"({"a":+1})", "Line 1, Column 6: unexpected character"},
    {"no digit after the point", R"({"a":1.})", "Line 1, Column 6: not a number"},
    {"no digit before the point", R"({"a":.5})", "Line 1, Column "},
    {"no exponent", R"({"a":1e})", "Line 1, Column 6: not a number"},
    {"hexadecimal", R"({"a":0x10})", "Line 1, Column "},
    {"beyond any number", R"({"a":1e999})", "Line 1, Column 6: a number beyond the range of a double"},
    {"below any number", R"({"a":-1e999})", "Line 1, Column 6: a number beyond the range of a double"},
    {"beyond any number, all its digits", "{\"a\":1" + std::string(400, '0') + "}", "Line 1, Column 6: a number"},
    {"colon after a number", R"({1:1})", "Line 1, Column 3: unexpected character"},
    {"infinity", R"({"a":Infinity})", "Line 1, Column "},
    {"not a number", R"({"a":NaN})", "Line 1, Column "},
    {"comment", R"({"a":1} // x)", "Line 1, Column "},
    {"trailing comma", R"({"a":1,})", "Line 1, Column "},
    {"dropped value", R"({"a":})", "Line 1, Column "},
    {"single quotes", R"({'a':1})", "Line 1, Column "},
    {"number for a key", R"({1:1})", "Line 1, Column "},
    {"wrong bracket", R"({"a":[1}})", "Line 1, Column "},
    {"word", R"({"a":tru})", "Line 1, Column 6: neither true, false nor null"},
    {"words in one", R"({"a":truefalse})", "Line 1, Column "},
    {"vertical tab", "{\v}", "Line 1, Column "},
};

std::string ArrayOf(std::size_t count, const std::string& value) {
  std::string text = R"({"a":[)";
  for (std::size_t i = 0; i < count; ++i) text += (i == 0 ? "" : ",") + value;
  return text + "]}";
}

TEST(JsonInput, AllowsItsNumberOfValuesAndNoMore) {
  const std::size_t most = kMaxJsonValues - 2;  // without the object and the array
  for (const char* value : {"1", "[]", "{}", "null", "\"\""}) {
    JsonFault fault;
    EXPECT_TRUE(JsonText::Check(ArrayOf(most, value), &fault)) << fault.text;
    EXPECT_FALSE(JsonText::Check(ArrayOf(most + 1, value), &fault)) << value;
    EXPECT_TRUE(fault.too_large);
    EXPECT_NE(fault.text.find("more than 100000 values"), std::string::npos) << fault.text;
  }
  JsonFault fault;
  EXPECT_TRUE(JsonText::Check(ArrayOf(most / 2, R"({"key" : 1})"), &fault)) << "a key is not a value: " << fault.text;
  EXPECT_FALSE(JsonText::Check(ArrayOf(1, "::::"), &fault));
  EXPECT_FALSE(fault.too_large);
}

// mallinfo2(3) measures the memory of the value.
TEST(JsonInput, BoundsTheMemoryOfTheValue) {
  const std::string texts[] = {ArrayOf(50000, "1"),
                               ArrayOf(50000, "[]"),
                               ArrayOf(50000, "{}"),
                               ArrayOf(33000, R"({"k":1})"),
                               ArrayOf(33000, R"({"a longer key":"a longer string"})"),
                               ArrayOf(50000, "\"a string of some 40 characters, I believe\""),
                               ArrayOf(33000, R"({"k":[]})"),
                               R"({"a":1})"};
  for (const std::string& text : texts) {
    JsonFault fault;
    const auto checked = JsonText::Check(text, &fault);
    ASSERT_TRUE(checked) << fault.text;
    std::string error;
    const auto before = mallinfo2();
    const auto value = checked->ParseObject(&error);
    const auto after = mallinfo2();
    ASSERT_TRUE(value) << error;
    const std::size_t taken = after.uordblks + after.hblkhd - before.uordblks - before.hblkhd;
    if (taken == 0 && text.size() > 1000) GTEST_SKIP() << "the sanitizers' allocator keeps no statistics";
    EXPECT_LE(taken, checked->cost()) << text.substr(0, 60);
    EXPECT_LE(checked->cost(), 3 * taken + 4096) << text.substr(0, 60);
  }
}

TEST(JsonInput, RefusesWhatIsNotStrictJson) {
  for (const RefusedInput& c : kRefusedInputs) {
    std::string error;
    EXPECT_FALSE(ParseJsonObject(c.text, &error)) << c.name;
    EXPECT_EQ(error.rfind(c.error, 0), 0U) << c.name << ": " << error;
    EXPECT_EQ(error.find('\n'), std::string::npos) << c.name << ": " << error;
  }
}

TEST(JsonInput, EveryPrefixOfADocumentIsRefused) {
  const std::string document = R"({"a":["\u00e9\ud83d\ude00",-1.5e+3,true,{"b":null}]})";
  std::string error;
  ASSERT_TRUE(ParseJsonObject(document, &error)) << error;
  for (std::size_t size = 0; size < document.size(); ++size) {
    EXPECT_FALSE(ParseJsonObject(std::string_view(document).substr(0, size), &error)) << size;
  }
}

TEST(JsonInput, OneRequestLeavesNothingForTheNext) {
  std::string error;
  EXPECT_FALSE(ParseJsonObject(R"({"a":1,"a":2})", &error));
  const auto value = ParseJsonObject(R"({"b":2})", &error);
  ASSERT_TRUE(value);
  EXPECT_EQ(value->getMemberNames(), std::vector<std::string>{"b"});
}

TEST(JsonInput, PlainTextHasNoNulAndIsUtf8) {
  EXPECT_TRUE(IsPlainUtf8("ü"));
  EXPECT_FALSE(IsPlainUtf8("a\0b"s));
  EXPECT_FALSE(IsPlainUtf8("\xfc"));
}

}  // namespace
}  // namespace vorn::server

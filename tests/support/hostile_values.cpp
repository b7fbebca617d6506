#include "hostile_values.h"

#include <cstdio>
#include <limits>
#include <utility>

namespace {

using Limits = std::numeric_limits<double>;

struct NamedText {
  const char* name;
  std::string text;
};

std::string Hex(const std::string& text) {
  std::string hex;
  for (const char c : text) {
    char byte[3];
    snprintf(byte, sizeof byte, "%02X", static_cast<unsigned>(static_cast<unsigned char>(c)));
    hex += byte;
  }
  return hex;
}

class Collection {
 public:
  void Add(const char* kind, const std::string& name, Json::Value value, bool never_stored) {
    values_.push_back({kind, name, std::move(value), never_stored});
  }

  // Adds a string alone, at the beginning, at the end and in the middle of a text.
  void AddPiece(const char* kind, const std::string& name, const std::string& piece, bool never_stored = true) {
    for (const std::string& text : {piece, piece + "b", "a" + piece, "a" + piece + "b"}) {
      Add(kind, name + " in " + Hex(text), text, never_stored);
    }
  }

  std::vector<HostileValue> Take() { return std::move(values_); }

 private:
  std::vector<HostileValue> values_;
};

const NamedText kLineBreaks[] = {{"LF", "\n"},
                                 {"CR", "\r"},
                                 {"CR LF", "\r\n"},
                                 {"vertical tab", "\v"},
                                 {"form feed", "\f"},
                                 {"next line", "\xC2\x85"},
                                 {"line separator", "\xE2\x80\xA8"},
                                 {"paragraph separator", "\xE2\x80\xA9"}};

const NamedText kMarks[] = {{"left-to-right mark", "\xE2\x80\x8E"},      {"right-to-left mark", "\xE2\x80\x8F"},
                            {"Arabic letter mark", "\xD8\x9C"},          {"left-to-right embedding", "\xE2\x80\xAA"},
                            {"right-to-left embedding", "\xE2\x80\xAB"}, {"pop", "\xE2\x80\xAC"},
                            {"left-to-right override", "\xE2\x80\xAD"},  {"right-to-left override", "\xE2\x80\xAE"},
                            {"left-to-right isolate", "\xE2\x81\xA6"},   {"right-to-left isolate", "\xE2\x81\xA7"},
                            {"first strong isolate", "\xE2\x81\xA8"},    {"pop isolate", "\xE2\x81\xA9"}};

const NamedText kLookAlikes[] = {{"full-width =", "\xEF\xBC\x9D"},       {"full-width #", "\xEF\xBC\x83"},
                                 {"full-width [", "\xEF\xBC\xBB"},       {"full-width (", "\xEF\xBC\x88"},
                                 {"full-width letter", "\xEF\xBD\x81"},  {"small =", "\xEF\xB9\xA6"},
                                 {"superscript =", "\xE2\x81\xBC"},      {"Cyrillic a", "\xD0\xB0"},
                                 {"Greek omicron", "\xCE\xBF"},          {"Armenian o", "\xD6\x85"},
                                 {"ligature fi", "\xEF\xAC\x81"},        {"mathematical a", "\xF0\x9D\x90\x9A"},
                                 {"no-break space", "\xC2\xA0"},         {"ideographic space", "\xE3\x80\x80"},
                                 {"zero-width space", "\xE2\x80\x8B"},   {"zero-width joiner", "\xE2\x80\x8D"},
                                 {"word joiner", "\xE2\x81\xA0"},        {"soft hyphen", "\xC2\xAD"},
                                 {"byte order mark", "\xEF\xBB\xBF"},    {"Hangul filler", "\xE3\x85\xA4"},
                                 {"variation selector", "\xEF\xB8\x8F"}, {"tag letter", "\xF3\xA0\x81\xA1"},
                                 {"private use", "\xEE\x80\x80"},        {"replacement of an object", "\xEF\xBF\xBC"}};

const NamedText kNoUtf8[] = {{"continuation alone", "\x80"},
                             {"letter of ISO 8859-1", "\xF6"},
                             {"overlong NUL", "\xC0\x80"},
                             {"overlong LF", "\xC0\x8A"},
                             {"overlong / of three bytes", "\xE0\x80\xAF"},
                             {"overlong LF of four bytes", "\xF0\x80\x80\x8A"},
                             {"half a surrogate pair", "\xED\xA0\x80"},
                             {"surrogate pair", "\xED\xA0\xBD\xED\xB8\x80"},
                             {"beyond Unicode", "\xF4\x90\x80\x80"},
                             {"five bytes", "\xF8\x88\x80\x80\x80"},
                             {"FE", "\xFE"},
                             {"FF", "\xFF"},
                             {"cut off", "\xE2\x80"}};

// Some parameters accept some of these: a domain may contain blanks, which are quoted.
constexpr const char* kSyntax[] = {
    "",           "=",         "a=b",        "#",         "a#b",       ";",        "a;b",         "[",     "[Static]",
    "]",          "\"",        "a\"b",       "'",         "a'b",       "a\"b'c#d", "$x",          "${x}",  "`id`",
    "$(id)",      "\\",        "a\\",        "\\040",     "\\012",     "%s%n",     "%0a",         "&#10;", " ",
    " a",         "a ",        "a b",        "(rw)",      "*(rw)",     "a(rw) *",  "*",           "**",    "?",
    "[a",         "-",         "-rw",        "--",        "@",         "@a",       "@a b",        "/",     "//",
    "..",         "../../etc", "a/../b",     "10",        "10.0.0.0/", "0/0",      "10.0.0.0/33", "::/0",  "::/129",
    "fe80::1%lo", "gss/krb5",  "include",    "INCLUDE",   "nobody",    "root",     "ROOT",        "root@", "@root",
    "null",       "true",      "NaN",        "nan",       "-nan",      "Infinity", "-inf",        "1e400", "0x10",
    "010",        "<script>",  "'; DROP --", "{\"a\":1}", "[1]",       "\\u000a",  "\\n[Static]"};

void AddTexts(Collection* all) {
  for (char c = 1; c < 0x20; ++c) all->AddPiece("control characters", "", std::string(1, c));
  all->AddPiece("control characters", "delete", "\x7F");
  for (const char* high : {"\xC2\x80", "\xC2\x90", "\xC2\x9B", "\xC2\x9F"})
    all->AddPiece("control characters", "C1", high);
  for (const NamedText& text : kMarks) all->AddPiece("marks of direction", text.name, text.text);
  for (const NamedText& text : kNoUtf8) all->AddPiece("no UTF-8", text.name, text.text);
  // The character is combined with Latin letters, because a word of one alphabet is valid.
  for (const NamedText& text : kLookAlikes) all->Add("look-alikes", text.name, "alice" + text.text + "@X", true);
  // A C string ends at the NUL byte, so the text before it may be stored.
  all->AddPiece("NUL", "NUL", std::string(1, '\0'), false);
  all->Add("NUL", "behind a name", std::string("alice\0[Static]", 14), false);
  for (const char* text : kSyntax) all->Add("syntax of files", text, text, false);
}

void AddSmuggledLines(Collection* all) {
  for (const NamedText& end : kLineBreaks) {
    for (const char* line :
         {"[Static]", "evil@X = root", "/volume1/media *(rw,no_root_squash)", "#", "Domain = evil", ""}) {
      all->Add("smuggled lines", end.name, "a" + end.text + line + end.text, true);
      all->Add("smuggled lines", std::string(end.name) + " quoted", "\"" + end.text + line + "\"", true);
      all->Add("smuggled lines", std::string(end.name) + " continued", "a\\" + end.text + line, true);
    }
  }
}

void AddLargeTexts(Collection* all) {
  constexpr std::size_t kMebibyte = std::size_t{1} << 20;
  all->Add("large texts", "1 MiB of one letter", std::string(kMebibyte, 'a'), true);
  all->Add("large texts", "1 MiB of stars", std::string(kMebibyte, '*'), true);
  all->Add("large texts", "1 MiB of line feeds", std::string(kMebibyte, '\n'), true);
  std::string labels;
  while (labels.size() < kMebibyte) labels += "a.";
  all->Add("large texts", "1 MiB of labels", labels + "example", true);
  all->Add("large texts", "a page", std::string(4096, 'a'), true);
}

Json::Value Nested(int depth, bool objects) {
  Json::Value value(objects ? Json::objectValue : Json::arrayValue);
  for (; depth > 0; --depth) {
    Json::Value outer;
    if (objects) {
      outer["kerberos_principal"].swap(value);
    } else {
      outer.append(Json::Value()).swap(value);
    }
    value.swap(outer);
  }
  return value;
}

void AddStructures(Collection* all) {
  for (const int depth : {1, 64, 1000}) {
    all->Add("deep JSON", std::to_string(depth) + " arrays", Nested(depth, false), true);
    all->Add("deep JSON", std::to_string(depth) + " objects", Nested(depth, true), true);
  }
  Json::Value many(Json::arrayValue);
  for (int i = 0; i < 10'000; ++i) many.append(i);
  all->Add("deep JSON", "10,000 numbers", many, true);
}

void AddNumbers(Collection* all) {
  for (const Json::Int64 number : {Json::Int64{-1}, Json::Int64{0}, Json::Int64{1}, Json::Int64{65535},
                                   Json::Int64{65536}, Json::Int64{2147483647}, Json::Int64{-2147483647 - 1}}) {
    all->Add("integers", std::to_string(number), number, false);
  }
  for (const Json::Int64 number :
       {Json::Int64{2147483648}, Json::Int64{-2147483649}, Json::Int64{4294967295}, Json::Int64{4294967296},
        std::numeric_limits<Json::Int64>::max(), std::numeric_limits<Json::Int64>::min()}) {
    all->Add("huge integers", std::to_string(number), number, true);
  }
  all->Add("huge integers", "the largest", std::numeric_limits<Json::UInt64>::max(), true);
  for (const double number : {-0.0, 0.5, -0.5, 8192.0, 8192.5, 1e9, 2147483647.5, 1e10, 1e308, Limits::denorm_min()}) {
    all->Add("floats", std::to_string(number), number, false);
  }
  for (const double number : {Limits::quiet_NaN(), Limits::infinity(), -Limits::infinity()}) {
    all->Add("floats", std::to_string(number), number, true);
  }
  for (const bool on : {false, true}) all->Add("other types", on ? "true" : "false", on, false);
  all->Add("other types", "null", Json::Value(), false);
}

std::vector<HostileValue> CollectValues() {
  Collection all;
  AddTexts(&all);
  AddSmuggledLines(&all);
  AddLargeTexts(&all);
  AddStructures(&all);
  AddNumbers(&all);
  return all.Take();
}

void AddQuoted(const char* kind, const std::string& text, std::vector<HostileJson>* all) {
  all->push_back({kind, "\"a" + text + "b\""});
}

std::vector<HostileJson> CollectJson() {
  std::vector<HostileJson> all;
  for (char c = 0; c < 0x20; ++c) AddQuoted("control characters as they are", std::string(1, c), &all);
  for (const NamedText& text : kNoUtf8) AddQuoted("no UTF-8", text.text, &all);
  for (const char* escape :
       {"\\u0000", "\\ud800", "\\udc00", "\\ud800\\ud800", "\\ud800x", "\\u12", "\\x0a", "\\'", "\\0"}) {
    AddQuoted("escapes", escape, &all);
  }
  for (const char* text :
       {"NaN", "nan", "-NaN", "+NaN", "Infinity", "-Infinity", "inf",   "01",    "-01", "+1",
        "1.",  ".5",  "-",    "1e",   "1e+",      "0x10",      "1_000", "1,000", "--1", "\xEF\xBC\x91"}) {
    all.push_back({"spellings of numbers", text});
  }
  for (const std::size_t depth : {std::size_t{65}, std::size_t{1000}, std::size_t{100'000}}) {
    all.push_back({"deep JSON", std::string(depth, '[') + std::string(depth, ']')});
    all.push_back({"deep JSON", std::string(depth, '[')});
  }
  for (const char* text : {"'a'", "a", "True", "None", "undefined", "\"a", "[1,]", "{\"a\":1,}", "{\"a\":1,\"a\":2}",
                           "{a:1}", "1 2", "/**/1", "1//",
                           "\xEF\xBB\xBF"
                           "1"}) {
    all.push_back({"malformed", text});
  }
  return all;
}

}  // namespace

const std::vector<HostileValue>& HostileValues() {
  static const std::vector<HostileValue> values = CollectValues();
  return values;
}

const std::vector<HostileJson>& HostileJsonTexts() {
  static const std::vector<HostileJson> texts = CollectJson();
  return texts;
}

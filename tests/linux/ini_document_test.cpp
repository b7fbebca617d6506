#include "ini_document.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "ascii.h"
#include "ini_judge.h"

namespace vorn {
namespace {

using testing::ElementsAre;

IniDocument Parsed(std::string_view text) { return IniDocument::Parse(std::string(text)); }

void Set(IniDocument* document, std::string_view section, std::string_view key, std::string_view value) {
  document->Set(*IniSection::From(section), *IniKey::From(key), *IniValue::From(value));
}

// The values of two sections of the document, in the form that nfsconf(8) gives.
IniContent ContentOf(const IniDocument& document) {
  IniContent content;
  for (const char* section : {"a", "b c"}) {
    for (const IniEntry& entry : document.Entries(section)) content[section][LowerAscii(entry.key)] = entry.value;
  }
  return content;
}

struct ReadCase {
  const char* name;
  std::string_view text;
  const char* value;  // of k in a; null: none
};

const ReadCase kReadCases[] = {
    {"plain", "[a]\nk=v\n", "v"},
    {"blanks around", " [ a ] \n\t k \t=  v w \t\n", "v w"},
    {"names in any case", "[A]\nK=v\n", "v"},
    {"the last of several", "[a]\nk=v\nk=w\n", "w"},
    {"the last of several blocks", "[a]\nk=v\n[b c]\nk=x\n[a]\nk=w\n", "w"},
    {"an empty one counts for nothing", "[a]\nk=v\nk=\nk=\"\"\n", "v"},
    {"comment after a value", "[a]\nk=v#w\n", "v"},
    {"comment of the other kind", "[a]\nk=v ;w\n", "v"},
    {"a comment only", "[a]\nk= # v\n", nullptr},
    {"comment lines", "[a]\n# k=v\n ;k=v\n", nullptr},
    {"double quotes", "[a]\nk = \" v # w;\" # comment\n", " v # w;"},
    {"single quotes", "[a]\nk = 'v \" w'\n", "v \" w"},
    {"text after quotes", "[a]\nk = \"v\"w\n", "v"},
    {"quote that is not closed", "[a]\nk = \"v\n", nullptr},
    {"quotes inside", "[a]\nk = o\"v'\n", "o\"v'"},
    {"equals sign in a value", "[a]\nk=v=w\n", "v=w"},
    {"bracket in a value", "[a]\nk=[v]\n", "[v]"},
    {"hash in another key", "[a]\nx#k=v\n", nullptr},
    {"line feeds with carriage returns", "[a]\r\nk=v\r\n", "v"},
    {"no line feed at the end", "[a]\nk=v", nullptr},
    {"continued line", "[a]\nk=v\\\nw\n", "v  w"},
    {"continued key", "[a]\n\\\nk\\\n=v\n", "v"},
    {"continued comment", "[a]\n# x\\\nk=v\n", nullptr},
    {"continued section", "[a\\\n]\nk=v\n", "v"},
    {"continued into the end", "[a]\nk=v\\\n", nullptr},
    {"carriage return does not continue", "[a]\r\nk=v\\\r\nw\r\n", "v\\"},
    {"text after a section", "[a] x\nk=v\n", "v"},
    {"section with an argument", "[a \"x\"]\nk=v\n", nullptr},
    {"section with an argument is overridden", "[a \"x\"]\nk=w\n[a]\nk=v\n", "v"},
    {"section whose argument is not closed", "[a \"x]\nk=v\n", "v"},
    {"section that is not closed", "[a]\nk=v\n[a\nk=w\n", "v"},
    {"bracket at a key's beginning", "[a]\n[k=w\nk=v\n", nullptr},
    {"no section", "k=v\n", nullptr},
    {"no assignment", "[a]\nk\nk:v\n=v\n", nullptr},
    {"form feeds belong to a value's beginning only", "[a]\nk=\fv\f\n", "\fv"},
    {"byte-order mark", "\xef\xbb\xbf[a]\nk=v\n", nullptr},
    {"bytes beyond ASCII", "[a]\nk=\xc3\xa9\xa0\n", "\xc3\xa9\xa0"},
};

TEST(IniDocument, ReadsWhatNfsUtilsReads) {
  for (const ReadCase& c : kReadCases) {
    const IniDocument document = Parsed(c.text);
    EXPECT_EQ(document.Get("a", "k").value_or("none"), c.value == nullptr ? "none" : c.value) << c.name;
    IniContent judged = ReadByNfsconf(c.text);
    EXPECT_EQ(document.Get("a", "k").value_or(""), judged["a"]["k"]) << c.name;
    EXPECT_EQ(document.Text(), c.text) << c.name;
  }
}

TEST(IniDocument, TextWithoutASectionKeepsEverythingButItsAssignments) {
  const IniDocument document =
      Parsed("k=0\n[a]\n# k=1\nk=1\nj \\\n = 2\n[b]\nk=1\n[A \"x\"]\nk=3\ninclude = f\n[a\nk=4\n[a]\nk=5");
  EXPECT_EQ(document.TextWithout("a"), "k=0\n[a]\n# k=1\n[b]\nk=1\n[A \"x\"]\ninclude = f\n[a\nk=4\n[a]\nk=5");
  EXPECT_EQ(document.TextWithout("none"), document.Text());
}

TEST(IniDocument, LeavesEverythingFromANulByteOnWithoutEffect) {
  const std::string_view text("[a]\nj=1\nk=v\0w\nl=2\n", 19);
  IniDocument document = Parsed(text);
  EXPECT_EQ(document.Get("a", "j"), "1");
  EXPECT_FALSE(document.Get("a", "k").has_value());
  EXPECT_FALSE(document.Get("a", "l").has_value());
  EXPECT_EQ(document.Text(), text);
  Set(&document, "a", "k", "x");
  EXPECT_EQ(document.Text(), std::string("[a]\nj=1\nk = x\n") + std::string(text.substr(8)));
}

TEST(IniDocument, ListsIncludesWithTheSectionThatTheyAreIn) {
  const IniDocument document =
      Parsed("include=x\n[A]\nInclude = y # why\ninclude=\n[b \"c\"]\ninclude=z\n[d\ninclude=w\n");
  const std::vector<IniInclude> includes = document.Includes();
  ASSERT_EQ(includes.size(), 3U);
  EXPECT_EQ(includes[0].section, IniDocument::kInherited);
  EXPECT_EQ(includes[1].section, "a");
  EXPECT_EQ(includes[1].file, "y");
  EXPECT_EQ(includes[1].line, 3);
  EXPECT_EQ(includes[2].section, "b");
  EXPECT_FALSE(includes[1].has_argument);
  EXPECT_TRUE(includes[2].has_argument);
}

TEST(IniDocument, ListsASectionsKeysInOrder) {
  const IniDocument document = Parsed("[a]\nz=1\nY=2\nz=3\nx=\n[b]\nz=4\n[A]\nw=5\n");
  std::vector<std::string> texts;
  for (const IniEntry& entry : document.Entries("a")) texts.push_back(entry.key + "=" + entry.value);
  EXPECT_THAT(texts, ElementsAre("Y=2", "z=3", "w=5"));
}

TEST(IniDocument, NamesTheLineThatCounts) {
  const IniDocument document = Parsed("[a]\nk=v\\\nw\n\nj=1\nk=2\n");
  EXPECT_EQ(document.Find("a", "j")->line, 5);
  EXPECT_EQ(document.Find("a", "k")->line, 6);
  EXPECT_FALSE(document.Find("a", "x").has_value());
}

struct EditCase {
  const char* name;
  std::string_view before;
  const char* value;  // of k in a; null: removed
  std::string_view after;
};

const EditCase kEditCases[] = {
    {"changed in place", "# ours\n[a]\n k =  v \t; kept\n\n[b]\nk=1\n", "w",
     "# ours\n[a]\n k =  w \t; kept\n\n[b]\nk=1\n"},
    {"last line with a comment", "[a]\nk= v # x", "w", "[a]\nk = w\nk= v # x"},
    {"equal value changes nothing", "[a]\nk= v \n[b]\n\nx", "v", "[a]\nk= v \n[b]\n\nx"},
    {"new key after the section's last", "[a]\nj=1\n\n# of b\n[b]\n", "v", "[a]\nj=1\nk = v\n\n# of b\n[b]\n"},
    {"new key in a section without one", "[a]\n# what\n[b]\n", "v", "[a]\nk = v\n# what\n[b]\n"},
    {"new key in the last of several blocks", "[a]\nj=1\n[b]\n[a]\n", "v", "[a]\nj=1\n[b]\n[a]\nk = v\n"},
    {"new section", "[b]\nk=1\n", "v", "[b]\nk=1\n\n[a]\nk = v\n"},
    {"new section in an empty file", "", "v", "[a]\nk = v\n"},
    {"new section below a blank line", "# x\n\n", "v", "# x\n\n[a]\nk = v\n"},
    {"new section where lines end by two characters", "# x\r\n", "v", "# x\r\n\r\n[a]\r\nk = v\r\n"},
    {"changed where lines end by two characters", "[a]\r\nk=v\r\n", "w", "[a]\r\nk=w\r\n"},
    {"the last of several lines", "[a]\nk=1\nk=2\n", "v", "[a]\nk=1\nk=v\n"},
    {"an empty value", "[a]\nk =\n", "v", "[a]\nk =\nk = v\n"},
    {"an empty value before a comment", "[a]\nk = # x\n", "v", "[a]\nk = # x\nk = v\n"},
    {"quoted where it must be", "[a]\nk=v\n", " #;", "[a]\nk=\" #;\"\n"},
    {"quoted the other way", "[a]\nk=v\n", "\"w;", "[a]\nk='\"w;'\n"},
    {"backslash at the end", "[a]\nk=v\nj=1\n", "w\\", "[a]\nk=\"w\\\"\nj=1\n"},
    {"quotes that were there", "[a]\nk=\"v\" # x\n", "w", "[a]\nk=w # x\n"},
    {"text after the old quotes", "[a]\n k=\"v\"x # y\n", "w", "[a]\nk = w\n"},
    {"old quote that is not closed", "[a]\nk=\"v\n", "w", "[a]\nk=\"v\nk = w\n"},
    {"continued old value", "[a]\nk=1\\\n2 # x\nj=1\n", "w", "[a]\nk=w # x\nj=1\n"},
    {"equal value on a last line without line feed", "[a]\nk=v", "v", "[a]\nk = v\nk=v"},
    {"last line that ends in a backslash", "[a]\nj=v\\", "w", "[a]\nk = w\nj=v\\"},
    {"comment without line feed", "[b]\n# x", "v", "[b]\n\n[a]\nk = v\n# x"},
    {"removed", "[a]\n# x\nk=v # y\nj=1\n", nullptr, "[a]\n# x\nj=1\n"},
    {"removed wherever it stands", "[a]\nk=1\n[b]\nk=2\n[A]\nK=3\nk=\n", nullptr, "[a]\n[b]\nk=2\n[A]\nk=\n"},
    {"nothing to remove", "[a]\nj=1\nk=2", nullptr, "[a]\nj=1\nk=2"},
    {"a last line without line feed stays", "[a]\nk=1\nk=2", nullptr, "[a]\nk=2"},
};

TEST(IniDocument, ChangesOneLineAndNoOtherByte) {
  for (const EditCase& c : kEditCases) {
    IniDocument document = Parsed(c.before);
    if (c.value != nullptr) {
      Set(&document, "a", "k", c.value);
    } else {
      document.Remove("a", "k");
    }
    EXPECT_EQ(document.Text(), c.after) << c.name;
    EXPECT_EQ(document.Get("a", "k").value_or("none"), c.value == nullptr ? "none" : c.value) << c.name;
    IniContent judged = ReadByNfsconf(c.after);
    EXPECT_EQ(document.Get("a", "k").value_or(""), judged["a"]["k"]) << c.name;
  }
}

TEST(IniDocument, ReadsAndEditsAKeyUnlessASectionWithAnArgumentHidesIt) {
  const bool is_hidden = ArgumentsHideValues();
  const char* const text = "[a]\nk=v\n[a \"x\"]\nk=1\n";
  IniDocument document = Parsed(text);
  EXPECT_EQ(document.Get("a", "k").has_value(), !is_hidden);
  Set(&document, "a", "k", "w");
  EXPECT_EQ(document.Text(), is_hidden ? text : "[a]\nk=w\n[a \"x\"]\nk=1\n");
  EXPECT_EQ(document.Remove("a", "k"), !is_hidden);
  EXPECT_EQ(document.Text(), is_hidden ? text : "[a]\n[a \"x\"]\nk=1\n");
}

TEST(IniDocument, TakesANewKeyWhereTheRemovedOneWas) {
  IniDocument document = Parsed("[a]\nj=1\n# x\nk=2\n\n[b]\n");
  ASSERT_TRUE(document.Remove("a", "k"));
  ASSERT_FALSE(document.Remove("a", "k"));
  Set(&document, "a", "l", "3");
  EXPECT_EQ(document.Text(), "[a]\nj=1\nl = 3\n# x\n\n[b]\n");
}

std::string RandomText(std::mt19937* random) {
  const char* const pieces[] = {"[a]",  "[B c]", "[a \"x\"]", "[a",   "\n",   "\n",  "\r\n",
                                "\\\n", "k",     "=",         "K = ", "j\t=", " v ", "\"",
                                "'w'",  "#",     "; x",       "\\",   "\f",   "k=v", "\n[a]\n"};
  std::uniform_int_distribution<std::size_t> piece(0, std::size(pieces) - 1);
  std::uniform_int_distribution<int> count(0, 40);
  std::string text = "[a]\n";
  for (int i = count(*random); i > 0; --i) text += pieces[piece(*random)];
  return text;
}

TEST(IniDocument, AgreesWithNfsUtilsOnAnyText) {
  std::mt19937 random(20260801);
  for (int i = 0; i < 300; ++i) {
    const std::string text = RandomText(&random);
    IniContent judged = ReadByNfsconf(text);
    for (auto section = judged.begin(); section != judged.end();) {
      const bool ours = section->first == "a" || section->first == "b c";
      section = ours && !section->second.empty() ? std::next(section) : judged.erase(section);
    }
    EXPECT_EQ(ContentOf(Parsed(text)), judged) << testing::PrintToString(text);
  }
}

TEST(IniDocument, KeepsEveryOtherValueWhateverIsEdited) {
  std::mt19937 random(20260802);
  for (int i = 0; i < 2000; ++i) {
    IniDocument document = Parsed(RandomText(&random));
    const std::optional<IniSetting> last = document.FindLast("a", "k");
    if (last && last->is_hidden) continue;  // left alone
    IniContent expected = ContentOf(document);
    if (i % 3 == 0) {
      document.Remove("a", "k");
      expected["a"].erase("k");
      if (expected["a"].empty()) expected.erase("a");
    } else {
      const char* value = i % 3 == 1 ? "new" : " #\"";
      Set(&document, "a", "k", value);
      expected["a"]["k"] = value;
    }
    EXPECT_EQ(ContentOf(document), expected) << document.Text();
    EXPECT_EQ(ContentOf(Parsed(document.Text())), expected) << document.Text();
  }
}

// With a loop over all lines for each operation this test would take hours and exceed its time limit.
TEST(IniDocument, GrowsWithItsTextOnly) {
  std::string text = "[a]\n";
  for (int i = 0; i < 100'000; ++i) text += "key" + std::to_string(i) + " = value\n";
  IniDocument document = Parsed(text + "[b]\nx=1\n");
  for (int i = 0; i < 100'000; ++i) Set(&document, "a", "key" + std::to_string(i), "other");
  for (int i = 100'000; i < 200'000; ++i) Set(&document, "a", "key" + std::to_string(i), "new");
  for (int i = 199'999; i >= 0; i -= 2) EXPECT_TRUE(document.Remove("a", "key" + std::to_string(i)));
  EXPECT_EQ(document.Entries("a").size(), 100'000U);
}

TEST(IniDocument, GrowsWithItsTextOnlyIfOneKeyIsRepeated) {
  std::string text = "[a]\nk=v\n";
  for (int i = 0; i < 200'000; ++i) text += "k =\nk=" + std::to_string(i) + "\n";
  IniDocument document = Parsed(text);
  EXPECT_EQ(document.Entries("a").size(), 1U);
  EXPECT_EQ(document.Get("a", "k"), "199999");
  EXPECT_TRUE(document.Remove("a", "k"));
  EXPECT_EQ(document.Entries("a").size(), 0U);
}

}  // namespace
}  // namespace vorn

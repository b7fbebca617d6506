#include "host_pattern.h"

#include <gtest/gtest.h>

#include <string>

namespace vorn {
namespace {

struct Comparison {
  const char* pattern;
  const char* name;
  bool is_match;
};

TEST(MatchesHostPattern, ComparesAsMountdDoes) {
  const Comparison cases[] = {
      {"*", "host", true},
      {"*", "", true},
      {"**", "host", true},
      {"?", "", false},
      {"host", "host", true},
      {"host", "hosts", false},
      {"hosts", "host", false},
      {"*.example", "a.example", true},
      {"*.example", "a.b.example", true},
      {"*.example", ".example", true},
      {"*.example", "example", false},
      {"*.example", "a.example.org", false},
      {"*.EXAMPLE", "A.example", true},
      {"*a*b*c", "xaxbxbxc", true},
      {"*a*b*c", "xaxbxbx", false},
      {"h?st*", "host", true},
      {"h?st", "hst", false},
      {"host[1-3]", "host2", true},
      {"host[1-3]", "host4", false},
      {"host[1-3].example", "host3.example", true},
      {"host[^1-3]", "host2", false},
      {"host[^1-3]", "host4", true},
      {"[!a]*", "a.example", true},  // "!" is an ordinary character
      {"[!a]*", "b.example", false},
      {"[ab]*", "B.example", true},
      {"[a-c]*", "b.example", true},
      {"[a-c]*", "B.example", false},  // a range does not ignore case
      {"[A-C]*", "b.example", false},
      {"[]a]x", "]x", true},
      {"[-a]x", "-x", true},
      {"[a-]x", "-x", true},
      {"[^-a]x", "-x", false},
      {"[a-cx-z]", "y", true},
      {"[a-cx-z]", "m", false},
      {"[abc", "a", false},
      {"[a-", "a", false},
      {"[", "[", false},
      {"[^", "a", false},
      {"a\\*b", "a*b", true},
      {"a\\*b", "axb", false},
      {"a\\", "a\\", true},
  };
  for (const Comparison& one : cases) {
    EXPECT_EQ(MatchesHostPattern(one.name, one.pattern), one.is_match) << one.pattern << " " << one.name;
  }
}

TEST(MatchesHostPattern, ComparesLongPatternsWithLongNames) {
  std::string pattern;
  for (int count = 0; count < 100; ++count) pattern += "*a";
  EXPECT_TRUE(MatchesHostPattern(std::string(250, 'a'), pattern));
  EXPECT_FALSE(MatchesHostPattern(std::string(250, 'a'), pattern + "*b"));  // not in this life, by trying all ways
}

}  // namespace
}  // namespace vorn

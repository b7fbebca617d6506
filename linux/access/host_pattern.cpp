#include "host_pattern.h"

#include "ascii.h"

namespace vorn {
namespace {

bool IsSame(char a, char b) { return LowerAscii(a) == LowerAscii(b); }

// Whether a character is in the set that begins at `*pattern`, which becomes what follows the set. A set without an end
// has no characters.
bool IsInSet(char c, const char** pattern) {
  const char* at = *pattern;
  const bool is_negated = at[1] == '^';
  if (is_negated) ++at;
  bool is_in = false;
  if (at[1] == ']' || at[1] == '-') is_in = IsSame(*++at, c);  // an ordinary character at the beginning
  char last = *at;
  while (*++at != '\0' && *at != ']') {
    if (*at == '-' && at[1] != ']' && at[1] != '\0') {
      ++at;
      is_in = is_in || (last <= c && c <= *at);
    } else {
      is_in = is_in || IsSame(*at, c);
    }
    last = *at;
  }
  if (*at == '\0') return false;
  *pattern = at + 1;
  return is_in != is_negated;
}

// Whether the part of a pattern that stands for one character matches it. `*pattern` becomes what follows the part.
bool MatchesOne(char c, const char** pattern) {
  if (**pattern == '[') return IsInSet(c, pattern);
  if (**pattern == '\\' && (*pattern)[1] != '\0') ++*pattern;
  const char wanted = **pattern;
  if (wanted == '\0') return false;
  ++*pattern;
  return wanted == '?' || IsSame(wanted, c);
}

}  // namespace

bool MatchesHostPattern(const std::string& name, const std::string& pattern) {
  const char* rest = pattern.c_str();
  const char* after_star = nullptr;   // the pattern after the last "*"
  const char* behind_star = nullptr;  // the text that this "*" does not stand for
  for (const char* text = name.c_str(); *text != '\0';) {
    if (*rest == '*') {
      after_star = ++rest;
      behind_star = text;
    } else if (MatchesOne(*text, &rest)) {
      ++text;
    } else if (after_star != nullptr) {
      rest = after_star;
      text = ++behind_star;
    } else {
      return false;
    }
  }
  while (*rest == '*') ++rest;
  return *rest == '\0';
}

}  // namespace vorn

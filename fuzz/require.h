// The assertion that every target uses.
#ifndef VORN_FUZZ_REQUIRE_H
#define VORN_FUZZ_REQUIRE_H

#include <cstdio>
#include <cstdlib>

// Ends the program, which libFuzzer takes for a finding, and says which property does not hold.
inline void Require(bool property, const char* what = "a property") {
  if (property) return;
  std::fprintf(stderr, "does not hold: %s\n", what);
  std::abort();
}

#endif  // VORN_FUZZ_REQUIRE_H

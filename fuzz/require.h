// The assertion that every target uses.
#ifndef VORN_FUZZ_REQUIRE_H
#define VORN_FUZZ_REQUIRE_H

#include <cstdio>
#include <cstdlib>

// Prints the property that does not hold and aborts, which libFuzzer reports as a finding.
inline void Require(bool property, const char* what = "a property") {
  if (property) return;
  std::fprintf(stderr, "does not hold: %s\n", what);
  std::abort();
}

#endif  // VORN_FUZZ_REQUIRE_H

// Random test cases that can be repeated. VORN_SEED chooses other ones, VORN_CASES their number.
#ifndef VORN_TESTS_LINUX_GENERATED_CASE_H
#define VORN_TESTS_LINUX_GENERATED_CASE_H

#include <gtest/gtest.h>

#include <cstddef>
#include <cstdlib>
#include <iostream>
#include <random>
#include <string>
#include <utility>
#include <vector>

inline unsigned NumberFromEnvironment(const char* variable, unsigned fallback) {
  const char* text = std::getenv(variable);
  return text == nullptr ? fallback : static_cast<unsigned>(std::strtoul(text, nullptr, 10));
}

class Chance {
 public:
  explicit Chance(unsigned number) : random_(NumberFromEnvironment("VORN_SEED", 1) * 1'000'003U + number) {}

  int Below(int limit) { return std::uniform_int_distribution<int>(0, limit - 1)(random_); }
  bool OneIn(int count) { return Below(count) == 0; }

  template <typename T, std::size_t kSize>
  const T& Of(const T (&choices)[kSize]) {
    return choices[static_cast<std::size_t>(Below(static_cast<int>(kSize)))];
  }

 private:
  std::mt19937 random_;
};

// Runs the cases 0, 1, 2 ... until one fails. `run_case` returns whether the case made its change; at least a quarter
// of the cases must, otherwise the generator makes too many invalid cases to be a test.
template <typename RunCase>
void RunCases(unsigned number_of_cases, const RunCase& run_case) {
  const unsigned cases = NumberFromEnvironment("VORN_CASES", number_of_cases);
  unsigned done = 0;
  for (unsigned number = 0; number < cases && !testing::Test::HasFailure(); ++number) done += run_case(number) ? 1 : 0;
  std::cout << "  " << done << " of " << cases << " changes were made, the others refused\n";
  if (!testing::Test::HasFailure()) {
    EXPECT_GT(done, cases / 4);
  }
}

// The text after the last complete line, which the readers of INI files ignore.
inline std::string Tail(const std::string& text) { return text.substr(text.rfind('\n') + 1); }

// Files by path below the root.
using GeneratedFiles = std::vector<std::pair<std::string, std::string>>;

#endif  // VORN_TESTS_LINUX_GENERATED_CASE_H

// Random test cases that can be repeated. VORN_SEED chooses other ones, VORN_CASES their number.
#ifndef VORN_TESTS_LINUX_GENERATED_CASE_H
#define VORN_TESTS_LINUX_GENERATED_CASE_H

#include <cstddef>
#include <cstdlib>
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

// Files by path below the root.
using GeneratedFiles = std::vector<std::pair<std::string, std::string>>;

#endif  // VORN_TESTS_LINUX_GENERATED_CASE_H

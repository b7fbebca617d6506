#include "log_quote.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

TEST(LogQuote, KeepsShortTexts) { EXPECT_EQ(QuotedForLog("für alice"), "für alice"); }

TEST(LogQuote, KeepsATextOnOneLine) { EXPECT_EQ(QuotedForLog("a\nb\x1b[0m\x7f"), "a?b?[0m?"); }

TEST(LogQuote, CutsLongTextsBetweenCharacters) {
  EXPECT_EQ(QuotedForLog(std::string(kMostQuotedBytes, 'x')), std::string(kMostQuotedBytes, 'x'));
  EXPECT_EQ(QuotedForLog(std::string(kMostQuotedBytes + 1, 'x')), std::string(kMostQuotedBytes - 3, 'x') + "...");
  std::string umlauts = "x";
  while (umlauts.size() < 2 * kMostQuotedBytes) umlauts += "ü";
  const std::string cut = QuotedForLog(umlauts);
  EXPECT_LE(cut.size(), kMostQuotedBytes);
  EXPECT_EQ(cut.substr(cut.size() - 5), "ü...");
}

}  // namespace
}  // namespace vorn::server

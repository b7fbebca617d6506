#include "secret.h"

#include <gtest/gtest.h>

#include <set>

namespace vorn::server {
namespace {

TEST(Secret, HasTheFormThatScannersFind) {
  const std::string secret = NewSecret(kTokenPrefix);
  EXPECT_EQ(secret.size(), kTokenPrefix.size() + 72);
  EXPECT_TRUE(IsSecret(secret, kTokenPrefix));
  EXPECT_FALSE(IsSecret(secret, kSessionPrefix));
}

TEST(Secret, IsNeverTheSame) {
  std::set<std::string> secrets;
  for (int i = 0; i < 1000; ++i) secrets.insert(NewSecret(kSessionPrefix));
  EXPECT_EQ(secrets.size(), 1000U);
}

TEST(Secret, WithAnyOtherCharacterHasAWrongChecksum) {
  const std::string secret = NewSecret(kTokenPrefix);
  for (std::size_t i = 0; i < secret.size(); ++i) {
    std::string other = secret;
    other[i] = other[i] == '0' ? '1' : '0';
    EXPECT_FALSE(IsSecret(other, kTokenPrefix)) << i;
  }
  EXPECT_FALSE(IsSecret(secret + "0", kTokenPrefix));
  EXPECT_FALSE(IsSecret(secret.substr(0, secret.size() - 1), kTokenPrefix));
  EXPECT_FALSE(IsSecret("", kTokenPrefix));
}

TEST(Secret, IsFoundInsideOfAText) {
  for (const std::string_view prefix : {kTokenPrefix, kSessionPrefix, kCodePrefix}) {
    const std::string secret = NewSecret(prefix);
    EXPECT_TRUE(ContainsSecret(secret));
    EXPECT_TRUE(ContainsSecret("Bearer vorn_" + secret + "."));
    EXPECT_FALSE(ContainsSecret(secret.substr(0, secret.size() - 1)));
  }
  EXPECT_FALSE(ContainsSecret(""));
  EXPECT_FALSE(ContainsSecret("vorn_" + NewId()));
}

TEST(Secret, IsStoredAsItsSha256Digest) {
  EXPECT_EQ(DigestOf("abc"), "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");  // FIPS 180-4
}

TEST(Secret, IsOverwritten) {
  std::string text = "a password that is longer than a small string";
  const char* const memory = text.data();
  const std::size_t size = text.size();
  Wipe(&text);
  EXPECT_TRUE(text.empty());
  EXPECT_EQ(std::string(memory + 1, size - 1), std::string(size - 1, '\0'));
}

}  // namespace
}  // namespace vorn::server

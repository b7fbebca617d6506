#include "browser_guard.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

TEST(BrowserGuard, LoopbackNamesAreThisMachine) {
  for (const char* host : {"localhost", "LocalHost:8080", "127.0.0.1", "127.0.0.1:1", "[::1]", "[::1]:65535"}) {
    EXPECT_TRUE(IsLoopbackHost(host)) << host;
  }
}

TEST(BrowserGuard, EveryOtherNameIsNot) {
  for (const char* host : {"", "evil.example", "localhost.evil.example", "127.0.0.1.evil.example", "localhost:evil",
                           "localhost:80:80", "127.0.0.10", "127.0.0.2", "::1", "[::1", "[::1]x", "0.0.0.0",
                           "localhost:123456", "localhost@evil.example", " localhost"}) {
    EXPECT_FALSE(IsLoopbackHost(host)) << host;
  }
}

TEST(BrowserGuard, OriginsAreWebPagesOfThisMachine) {
  EXPECT_TRUE(IsLoopbackOrigin("http://localhost:8080"));
  EXPECT_TRUE(IsLoopbackOrigin("https://127.0.0.1"));
  for (const char* origin : {"", "null", "localhost", "file://", "http://evil.example", "http://localhost.evil.example",
                             "ftp://localhost", "http://localhost/", "http://"}) {
    EXPECT_FALSE(IsLoopbackOrigin(origin)) << origin;
  }
}

}  // namespace
}  // namespace vorn::server

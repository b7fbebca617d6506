#include "browser_guard.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

TEST(OwnNames, AreLoopbackNamesWithAnyPort) {
  const OwnNames names;
  for (const char* host :
       {"localhost", "LOCALHOST", "localhost:8080", "127.0.0.1", "127.0.0.1:1", "[::1]", "[::1]:65535", "localhost:"}) {
    EXPECT_TRUE(names.Include(host, false)) << host;
  }
  for (const char* host :
       {"", "nas.example", "localhost.evil.example", "127.0.0.1.evil.example", "127.0.0.10", "127.1", "::1", "[::1",
        "localhost:80x", "localhost:808080", "evil.example:localhost", " localhost"}) {
    EXPECT_FALSE(names.Include(host, false)) << host;
  }
}

TEST(OwnNames, IncludeThoseThatAreGiven) {
  const OwnNames names({"NAS.example", "[2001:db8::1]"});
  for (const char* host : {"nas.example", "Nas.Example:8443", "[2001:db8::1]:443", "localhost"}) {
    EXPECT_TRUE(names.Include(host, false)) << host;
  }
  for (const char* host : {"nas.example.evil.example", "xnas.example", "example", "[2001:db8::12]"}) {
    EXPECT_FALSE(names.Include(host, false)) << host;
  }
}

TEST(OwnNames, AreAnOriginIfSchemeHostAndPortAreTheSame) {
  const OwnNames names({"nas.example"});
  const struct {
    const char* origin;
    const char* host;
    bool own;
  } cases[] = {
      {"http://localhost:8080", "localhost:8080", true},
      {"http://LOCALHOST", "localhost:80", true},
      {"http://localhost:80", "localhost", true},
      {"http://[::1]:8080", "[::1]:8080", true},
      {"https://nas.example", "nas.example", true},
      {"https://nas.example:443", "Nas.example", true},
      {"https://nas.example:8443", "nas.example:8443", true},
      // another port of this machine, or another name of it
      {"http://localhost:3000", "localhost:8080", false},
      {"http://localhost", "localhost:8080", false},
      {"http://127.0.0.1:8080", "localhost:8080", false},
      {"http://localhost:443", "localhost", false},
      // another scheme
      {"https://localhost:8080", "localhost:8080", false},
      {"http://nas.example", "nas.example", false},
      {"https://nas.example:80", "nas.example", false},
      // other sites
      {"https://evil.example", "evil.example", false},
      {"https://evil.example", "nas.example", false},
      {"https://nas.example.evil.example", "nas.example", false},
      {"null", "localhost:8080", false},
      {"", "localhost:8080", false},
      {"file://", "localhost", false},
      {"http://localhost:8080", "", false},
      {"http://", "", false},
  };
  for (const auto& c : cases)
    EXPECT_EQ(names.AreOrigin(c.origin, c.host, false), c.own) << c.origin << " at " << c.host;
}

TEST(OwnNames, WithTlsIncludeTheMachineAndEveryAddress) {
  const OwnNames names({"nas.example"}, "Box");
  for (const char* host : {"box", "BOX:8443", "192.0.2.7", "192.0.2.7:8443", "[2001:db8::1]", "[2001:db8::1]:443",
                           "localhost", "nas.example:443"}) {
    EXPECT_TRUE(names.Include(host, true)) << host;
    EXPECT_TRUE(names.AreSecure(host, true)) << host;
  }
  for (const char* host : {"", "boxes", "box.evil.example", "192.0.2.7.evil.example", "192.0.2.7:x", "[2001:db8::1",
                           "[2001:db8::1]x", "[box]", "2001:db8::1", ":443"}) {
    EXPECT_FALSE(names.Include(host, true)) << host;
  }
  for (const char* host : {"box", "192.0.2.7"}) {
    EXPECT_FALSE(names.Include(host, false)) << host;
    EXPECT_FALSE(names.AreSecure(host, false)) << host;
  }
  EXPECT_FALSE(OwnNames().Include("", true));
  EXPECT_TRUE(names.HaveGiven());
  EXPECT_FALSE(OwnNames({}, "box").HaveGiven());
}

TEST(OwnNames, WithTlsAreAnOriginOfHttpsOnly) {
  const OwnNames names;
  EXPECT_TRUE(names.AreOrigin("https://localhost:8443", "localhost:8443", true));
  EXPECT_TRUE(names.AreOrigin("https://192.0.2.7", "192.0.2.7:443", true));
  for (const char* origin :
       {"http://localhost:8443", "https://localhost:8444", "https://evil.example", "null", "https://"}) {
    EXPECT_FALSE(names.AreOrigin(origin, "localhost:8443", true)) << origin;
  }
  EXPECT_FALSE(names.AreOrigin("https://", "", true));
}

TEST(FetchMetadata, TellsWhoseRequestItIs) {
  for (const char* site : {"same-origin", "none"}) EXPECT_TRUE(IsOwnFetch(site)) << site;
  for (const char* site : {"same-site", "cross-site", "", "new-word"}) EXPECT_FALSE(IsOwnFetch(site)) << site;
}

}  // namespace
}  // namespace vorn::server

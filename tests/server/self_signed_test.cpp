#include "self_signed.h"

#include <gmock/gmock.h>

#include <ctime>

#include "tls.h"

namespace vorn::server {
namespace {

using testing::Contains;

TlsIdentityPtr Make(const std::vector<std::string>& names) {
  std::string error;
  const std::optional<std::string> text = MakeSelfSigned(names, &error);
  EXPECT_TRUE(text) << error;
  TlsIdentityPtr identity = text ? TlsIdentity::Make(*text, *text, &error) : nullptr;
  EXPECT_TRUE(identity) << error;
  return identity;
}

TEST(SelfSigned, IsForItsNamesAndAddressesOnly) {
  const TlsIdentityPtr identity = Make({"nas.example", "192.0.2.7", "2001:db8::1"});
  ASSERT_TRUE(identity);
  for (const char* name : {"nas.example", "192.0.2.7", "2001:db8::1"}) EXPECT_TRUE(identity->Covers(name)) << name;
  for (const char* name : {"example", "www.nas.example", "192.0.2.8", "localhost"}) {
    EXPECT_FALSE(identity->Covers(name)) << name;
  }
}

TEST(SelfSigned, IsValidForTheLongestTimeThatBrowsersAccept) {
  const std::time_t day = std::time_t{24} * 60 * 60;
  const std::time_t end = std::time(nullptr) + (kSelfSignedDays - 1) * day;  // it is valid from yesterday
  const TlsIdentityPtr identity = Make({"nas.example"});
  EXPECT_LE(identity->not_after(), end);
  EXPECT_GT(identity->not_after(), end - day);
}

TEST(SelfSigned, TakesAHostNameThatIsTooLongForASubject) {
  const std::string name = std::string(60, 'a') + "." + std::string(60, 'b') + ".example";
  EXPECT_TRUE(Make({name})->Covers(name));
}

TEST(SelfSigned, IsNeverTheSameTwice) {
  EXPECT_NE(Make({"nas.example"})->fingerprint(), Make({"nas.example"})->fingerprint());
}

TEST(SelfSigned, WithANameThatNoCertificateCanHaveIsNotMade) {
  std::string error;
  EXPECT_FALSE(MakeSelfSigned({std::string()}, &error));
  EXPECT_EQ(error.rfind("no certificate can be made: ", 0), 0U) << error;
}

TEST(SelfSigned, TheNamesOfThisMachineAreThoseThatReachIt) {
  const std::vector<std::string> names = NamesOfThisMachine();
  EXPECT_THAT(names, Contains("localhost"));
  EXPECT_THAT(names, Contains("127.0.0.1"));
}

}  // namespace
}  // namespace vorn::server

#include "host_names.h"

#include <gtest/gtest.h>

#include <optional>
#include <string>
#include <utility>

namespace vorn {
namespace {

TEST(HostAddress, IsWrittenInOneWay) {
  const std::pair<const char*, const char*> cases[] = {{"10.0.0.1", "10.0.0.1"},
                                                       {"::ffff:10.0.0.1", "10.0.0.1"},
                                                       {"FD00:0:0::1", "fd00::1"},
                                                       {"::1", "::1"},
                                                       {"10.1", ""},
                                                       {"host", ""},
                                                       {"10.0.0.0/24", ""},
                                                       {"", ""}};
  for (const auto& [text, address] : cases) EXPECT_EQ(HostAddress(text).value_or(""), address) << text;
}

TEST(NameService, HasNoNamesForWhatIsNoAddress) {
  const NameService service = NameService::OfSystem();
  ASSERT_TRUE(service.names_of("host"));
  EXPECT_TRUE(service.names_of("host")->empty());
  EXPECT_FALSE(service.is_member("no-such-netgroup", "10.0.0.1"));
}

TEST(NameService, KnowsTheNameOfTheLoopbackAddress) {
  const auto names = NameService::OfSystem().names_of("127.0.0.1");
  if (!names || names->empty()) GTEST_SKIP() << "the name service of this machine does not know 127.0.0.1";
  EXPECT_NE(names->front(), "");
}

}  // namespace
}  // namespace vorn

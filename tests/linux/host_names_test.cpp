#include "host_names.h"

#include <gtest/gtest.h>

#include <chrono>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "name_table.h"

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

TEST(NameService, ThatRemembersAsksForEachThingOnce) {
  NameTable table{{{"c.example", "10.0.0.5"}}, {{"all", "c.example"}}};
  const NameService service = NameService::Remembering(table.service());
  for (int time = 0; time < 2; ++time) {
    EXPECT_EQ(service.resolve("c.example"), std::vector<std::string>{"10.0.0.5"});
    EXPECT_EQ(service.resolve("none.example"), std::vector<std::string>());
    EXPECT_EQ(service.names_of("10.0.0.5"), std::vector<std::string>{"c.example"});
    EXPECT_TRUE(service.is_member("all", "c.example"));
    EXPECT_FALSE(service.is_member("all", "none.example"));
  }
  EXPECT_EQ(table.questions, 5);
}

TEST(NameService, ThatKeepsTheBoxWaitingIsAskedNoMore) {
  NameTable table{{{"c.example", "10.0.0.5"}}, {}};
  std::chrono::steady_clock::time_point now;
  NameService slow = table.service();
  slow.names_of = [&now, ask = slow.names_of](const std::string& address) {
    now += std::chrono::seconds(4);
    return ask(address);
  };
  const NameService service = NameService::Remembering(slow, [&now] { return now; });
  EXPECT_TRUE(service.resolve("c.example"));
  EXPECT_TRUE(service.names_of("10.0.0.5"));
  table.is_away = true;
  for (int host = 10; host < 19; ++host) EXPECT_FALSE(service.names_of("10.0.0." + std::to_string(host)));
  EXPECT_FALSE(service.resolve("d.example"));
  EXPECT_EQ(table.questions, 5);
  EXPECT_TRUE(service.resolve("c.example"));  // it is remembered
}

TEST(NameService, ThatFailsAtOnceIsAskedAgain) {
  NameTable table{{{"c.example", "10.0.0.5"}}, {}};
  const NameService service =
      NameService::Remembering(table.service(), [] { return std::chrono::steady_clock::time_point(); });
  table.is_away = true;
  for (int host = 10; host < 19; ++host) EXPECT_FALSE(service.names_of("10.0.0." + std::to_string(host)));
  table.is_away = false;
  EXPECT_TRUE(service.names_of("10.0.0.5"));
}

}  // namespace
}  // namespace vorn

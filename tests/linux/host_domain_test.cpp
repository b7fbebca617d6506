#include "host_domain.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>

#include "processes.h"

namespace vorn {
namespace {

TEST(CanonicalName, IsTheFirstOneOfTheHostsLine) {
  const struct {
    const char* hosts;
    const char* name;
  } cases[] = {
      {"", "box"},
      {"127.0.0.1 localhost\n127.0.1.1 box.lab.example box\n", "box.lab.example"},
      {"127.0.1.1\tbox.lab.example other box # box.wrong.example box\n", "box.lab.example"},
      {"# 127.0.1.1 box.wrong.example box\n10.0.0.1 box\n", "box"},
      {"10.0.0.1 box.first.example box\n10.0.0.2 box.second.example box", "box.first.example"},
      {"10.0.0.1 mailbox.example boxer box.example\n10.0.0.2\n\n", "box"},
  };
  for (const auto& c : cases) EXPECT_EQ(CanonicalName(c.hosts, "box"), c.name) << c.hosts;
}

TEST(HostDomain, NeverWaitsForTheResolver) {
  std::promise<std::string> answer;
  const std::shared_future<std::string> answered = answer.get_future().share();
  HostDomain domain(
      "box.first.example", [answered] { return answered.get(); }, std::chrono::hours(1));
  EXPECT_EQ(domain.Get(), "first.example");
  EXPECT_EQ(domain.Get(), "first.example") << "the resolver has not answered yet";
  answer.set_value("box.second.example");
  EXPECT_TRUE(Eventually([&] { return domain.Get() == "second.example"; }));
}

TEST(HostDomain, AsksOnceWhileTheAnswerIsFresh) {
  auto count = std::make_shared<std::atomic<int>>(0);
  const auto resolve = [count] { return "box.d" + std::to_string(++*count) + ".example"; };
  HostDomain fresh("box", resolve, std::chrono::hours(1));
  EXPECT_EQ(fresh.Get(), "localdomain");
  EXPECT_TRUE(Eventually([&] { return fresh.Get() == "d1.example"; }));
  for (int i = 0; i < 100; ++i) fresh.Get();
  EXPECT_EQ(*count, 1);
  HostDomain stale("box", resolve, std::chrono::seconds(0));
  EXPECT_TRUE(Eventually([&] { return stale.Get() == "d4.example"; })) << "asks again and again";
}

}  // namespace
}  // namespace vorn

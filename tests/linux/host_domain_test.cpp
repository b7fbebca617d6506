#include "host_domain.h"

#include <gtest/gtest.h>
#include <netdb.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <climits>
#include <future>

#include "files.h"
#include "processes.h"

namespace {

std::string HostName() {
  std::array<char, HOST_NAME_MAX + 1> name{};
  return gethostname(name.data(), name.size() - 1) == 0 ? name.data() : "";
}

std::array<char, 18> canonical_name{"box.asked.example"};
addrinfo resolved_host{};

}  // namespace

// Replaces the resolver of the C library in this program: it knows only the canonical name of this host.
extern "C" int getaddrinfo(const char* host, const char* /*service*/, const addrinfo* hints, addrinfo** result) {
  if (host != HostName() || (hints->ai_flags & AI_CANONNAME) == 0) return EAI_NONAME;
  resolved_host.ai_canonname = canonical_name.data();
  *result = &resolved_host;
  return 0;
}

extern "C" void freeaddrinfo(addrinfo* /*result*/) noexcept {}

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
  auto count = std::make_shared<std::atomic<int>>(0);
  const auto resolve = [answered, count] {
    ++*count;
    return answered.get();
  };
  HostDomain domain("box.first.example", resolve, std::chrono::hours(1));
  for (int i = 0; i < 20; ++i) EXPECT_EQ(domain.Get(), "first.example") << "the resolver has not answered yet";
  answer.set_value("box.second.example");
  EXPECT_TRUE(Eventually([&] { return domain.Get() == "second.example"; }));
  EXPECT_EQ(*count, 1) << "asks while it is asking";
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

TEST(HostDomain, OfThisHostIsThatOfTheHostsFileUntilTheResolverAnswers) {
  const std::string name = CanonicalName(ReadFileOrNothing("/etc/hosts")->text, HostName());
  const std::size_t dot = name.find('.');
  HostDomain& domain = HostDomain::OfThisHost();
  EXPECT_EQ(domain.Last(), dot == std::string::npos ? "localdomain" : name.substr(dot + 1));
  EXPECT_TRUE(Eventually([&] { return domain.Get() == "asked.example"; }));
}

}  // namespace
}  // namespace vorn

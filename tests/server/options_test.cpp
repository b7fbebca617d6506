#include "options.h"

#include <gmock/gmock.h>

namespace vorn::server {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::variant<Options, int> Parse(std::vector<const char*> words) {
  words.insert(words.begin(), "vornd");
  return ParseOptions(static_cast<int>(words.size()), words.data());
}

TEST(Options, ServeTheBoxItselfByDefault) {
  const auto options = std::get<Options>(Parse({}));
  EXPECT_EQ(options.root, "/");
  EXPECT_EQ(options.modules, "");
  EXPECT_EQ(options.config, "");
  EXPECT_FALSE(options.check);
  EXPECT_THAT(options.listen, IsEmpty());
}

TEST(Options, AreAllTaken) {
  const auto options =
      std::get<Options>(Parse({"--root", "/srv/trial", "--modules=/m", "--listen", "unix:/a", "--listen", "127.0.0.1:1",
                               "--host-name", "nas", "--config", "/c", "--check"}));
  EXPECT_EQ(options.root, "/srv/trial");
  EXPECT_EQ(options.modules, "/m");
  EXPECT_EQ(options.config, "/c");
  EXPECT_TRUE(options.check);
  EXPECT_THAT(options.listen, ElementsAre("unix:/a", "127.0.0.1:1"));
  EXPECT_THAT(options.host_names, ElementsAre("nas"));
}

TEST(Options, HelpAndVersionEndWithSuccess) {
  testing::internal::CaptureStdout();
  EXPECT_EQ(std::get<int>(Parse({"--help"})), 0);
  EXPECT_EQ(std::get<int>(Parse({"--version"})), 0);
  const std::string text = testing::internal::GetCapturedStdout();
  for (const char* part : {"--root", "--modules", "--listen", "--host-name", "unix:/PATH", "vornd 1."})
    EXPECT_THAT(text, HasSubstr(part));
}

TEST(Options, AMistakeEndsTheProgramWithStatus2) {
  testing::internal::CaptureStderr();
  for (const char* word : {"--rot", "extra", "--root", "--listen", "--config"})
    EXPECT_EQ(std::get<int>(Parse({word})), 2) << word;
  EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("--rot"));
}

}  // namespace
}  // namespace vorn::server

#include "settings.h"

#include <gtest/gtest.h>

#include "temporary_root.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/vorn/platform.conf";

TEST(Settings, OfATrialRootNeedNoFile) {
  const TemporaryRoot root;
  const Result<Settings> settings = Settings::Load();
  ASSERT_TRUE(settings.ok());
  EXPECT_EQ(settings->engine, Settings::Engine::kLocal);
  EXPECT_EQ(settings->kerberos, Settings::Kerberos::kAuto);
  EXPECT_EQ(settings->admin_account, "admin");
  EXPECT_EQ(settings->guest_account, "nobody");
  EXPECT_FALSE(settings->firewall);
}

TEST(Settings, AreReadFromTheFile) {
  const TemporaryRoot root;
  root.Write(kFile,
             "[platform]\nservice_engine = systemd\nkerberos = no\nadmin_account = boss\nguest_account = visitor\n"
             "firewall = yes\n");
  const Result<Settings> settings = Settings::Load();
  ASSERT_TRUE(settings.ok());
  EXPECT_EQ(settings->engine, Settings::Engine::kSystemd);
  EXPECT_EQ(settings->kerberos, Settings::Kerberos::kNo);
  EXPECT_EQ(settings->admin_account, "boss");
  EXPECT_EQ(settings->guest_account, "visitor");
  EXPECT_TRUE(settings->firewall);
}

TEST(Settings, OfATrialRootNeverChooseSystemdThemselves) {
  const TemporaryRoot root;
  root.Write(kFile, "[platform]\nservice_engine = auto\n");
  EXPECT_EQ(Settings::Load()->engine, Settings::Engine::kLocal);
}

TEST(Settings, RefuseAnUnknownWordAndNameItsLine) {
  for (const char* key : {"service_engine", "kerberos", "firewall"}) {
    const TemporaryRoot root;
    root.Write(kFile, "# ours\n[platform]\n" + std::string(key) + " = maybe\n");
    const Result<Settings> settings = Settings::Load();
    ASSERT_FALSE(settings.ok()) << key;
    EXPECT_EQ(settings.status().code(), kSyntax);
    EXPECT_NE(settings.status().reason().find("platform.conf:3: " + std::string(key)), std::string::npos);
  }
}

}  // namespace
}  // namespace vorn

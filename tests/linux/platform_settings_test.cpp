#include "platform_settings.h"

#include <gtest/gtest.h>

#include "current_box.h"
#include "temporary_root.h"

namespace vorn {
namespace {

constexpr char kFile[] = "/etc/vorn/platform.conf";

TEST(PlatformSettings, OfATrialRootNeedNoFile) {
  const TemporaryRoot root;
  const auto settings = PlatformSettings::Load(CurrentBox());
  ASSERT_TRUE(settings.ok());
  EXPECT_EQ((*settings)->engine, PlatformSettings::EngineKind::kLocal);
  EXPECT_EQ((*settings)->kerberos, PlatformSettings::Kerberos::kAuto);
  EXPECT_EQ((*settings)->admin_account, "admin");
  EXPECT_EQ((*settings)->guest_account, "nobody");
  EXPECT_FALSE((*settings)->firewall);
}

TEST(PlatformSettings, AreReadFromTheFile) {
  const TemporaryRoot root;
  root.Write(kFile,
             "[platform]\nservice_engine = systemd\nkerberos = no\nadmin_account = boss\nguest_account = visitor\n"
             "firewall = yes\n");
  const auto settings = PlatformSettings::Load(CurrentBox());
  ASSERT_TRUE(settings.ok());
  EXPECT_EQ((*settings)->engine, PlatformSettings::EngineKind::kSystemd);
  EXPECT_EQ((*settings)->kerberos, PlatformSettings::Kerberos::kNo);
  EXPECT_EQ((*settings)->admin_account, "boss");
  EXPECT_EQ((*settings)->guest_account, "visitor");
  EXPECT_TRUE((*settings)->firewall);
}

TEST(PlatformSettings, OfATrialRootNeverChooseSystemdThemselves) {
  const TemporaryRoot root;
  root.Write(kFile, "[platform]\nservice_engine = auto\n");
  EXPECT_EQ((*PlatformSettings::Load(CurrentBox()))->engine, PlatformSettings::EngineKind::kLocal);
}

TEST(PlatformSettings, RefuseAnUnknownWordAndNameItsLine) {
  for (const char* key : {"service_engine", "kerberos", "firewall"}) {
    const TemporaryRoot root;
    root.Write(kFile, "# ours\n[platform]\n" + std::string(key) + " = maybe\n");
    const auto settings = PlatformSettings::Load(CurrentBox());
    ASSERT_FALSE(settings.ok()) << key;
    EXPECT_EQ(settings.status().code(), kSyntax);
    EXPECT_NE(settings.status().reason().find("platform.conf:3: " + std::string(key)), std::string::npos);
  }
}

}  // namespace
}  // namespace vorn

#include <gtest/gtest.h>
#include <sys/utsname.h>

#include <string>

#include "captured_log.h"
#include "nfsconf.h"
#include "temporary_root.h"

namespace {

constexpr const char* kSettings = "/etc/vorn/platform.conf";
constexpr const char* kContextCache = "/proc/net/rpc/auth.rpcsec.context/channel";

std::string ModuleList(const char* name) {
  utsname kernel{};
  EXPECT_EQ(uname(&kernel), 0);
  return std::string("/lib/modules/") + kernel.release + "/" + name;
}

TEST(VORNNFSSupportKerberos, FollowsTheSetting) {
  const TemporaryRoot root;
  root.Write(kSettings, "[platform]\nkerberos = yes\n");
  EXPECT_NE(VORNNFSSupportKerberos(), 0);
  root.Write(kContextCache, "");
  root.Write(kSettings, "[platform]\nkerberos = no\n");
  EXPECT_EQ(VORNNFSSupportKerberos(), 0);
}

TEST(VORNNFSSupportKerberos, IsWhatTheRunningKernelOffersOtherwise) {
  const TemporaryRoot none;
  EXPECT_EQ(VORNNFSSupportKerberos(), 0);
  const TemporaryRoot loaded;
  loaded.Write(kContextCache, "");
  EXPECT_NE(VORNNFSSupportKerberos(), 0);
}

TEST(VORNNFSSupportKerberos, IsOfferedByAModuleThatCanBeLoadedOrIsBuiltIn) {
  const TemporaryRoot loadable;
  loadable.Write(ModuleList("modules.dep"), "kernel/net/sunrpc/auth_gss/rpcsec_gss_krb5.ko.xz: kernel/x.ko\n");
  EXPECT_NE(VORNNFSSupportKerberos(), 0);
  const TemporaryRoot builtin;
  builtin.Write(ModuleList("modules.dep"), "kernel/net/sunrpc/auth_gss/auth_rpcgss.ko: kernel/x.ko\n");
  EXPECT_EQ(VORNNFSSupportKerberos(), 0);
  builtin.Write(ModuleList("modules.builtin"), "kernel/net/sunrpc/auth_gss/rpcsec_gss_krb5.ko\n");
  EXPECT_NE(VORNNFSSupportKerberos(), 0);
}

TEST(VORNNFSSupportKerberos, IsNoneWhereTheSettingsCannotBeRead) {
  const TemporaryRoot root;
  root.Write(kContextCache, "");
  root.Write(kSettings, "[platform]\nkerberos = perhaps\n");
  TakeLog();
  EXPECT_EQ(VORNNFSSupportKerberos(), 0);
  EXPECT_EQ(TakeLog().size(), 1U);
}

}  // namespace

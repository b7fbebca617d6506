#include "exports_options.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace vorn {
namespace {

using testing::HasSubstr;

ExportOptions Read(const std::vector<std::string>& lists) {
  ExportOptionReader reader;
  for (const std::string& list : lists) EXPECT_TRUE(reader.Apply(list).ok()) << list;
  return reader.Options();
}

struct OptionCase {
  std::vector<std::string> lists;  // defaults first, the client's own last
  const char* text;                // their meaning
};

TEST(ExportOptionReader, MeansWhatExportfsMakesOfTheLists) {
  const OptionCase cases[] = {
      {{}, "ro,sync,root_squash,sec=sys"},
      {{""}, "ro,sync,root_squash,sec=sys"},
      {{"rw,"}, "rw,sync,root_squash,sec=sys"},
      {{" \trw"}, "rw,sync,root_squash,sec=sys"},
      {{"rw,ro"}, "ro,sync,root_squash,sec=sys"},
      {{"async,insecure,crossmnt"}, "ro,async,insecure,crossmnt,root_squash,sec=sys"},
      {{"async,insecure,crossmnt", "sync,secure,nocrossmnt"}, "ro,sync,root_squash,sec=sys"},
      {{"no_root_squash"}, "ro,sync,no_root_squash,sec=sys"},
      {{"all_squash,anonuid=1000,anongid=100"}, "ro,sync,root_squash,all_squash,anonuid=1000,anongid=100,sec=sys"},
      {{"all_squash", "no_all_squash"}, "ro,sync,root_squash,sec=sys"},
      {{"anonuid=-2,anongid= +7"}, "ro,sync,root_squash,anonuid=-2,anongid=7,sec=sys"},
      {{"sec=unix:null:sys"}, "ro,sync,root_squash,sec=sys:none"},
      {{"sec=krb5:krb5i,sec=krb5p,rw"},
       "sync,sec=krb5:krb5i,ro,root_squash,no_all_squash,secure,sec=krb5p,rw,root_squash,no_all_squash,secure"},
      {{"sec=krb5,rw,sec=sys,ro,no_root_squash,sec=krb5i"},
       "sync,sec=krb5,rw,root_squash,no_all_squash,secure,sec=sys:krb5i,ro,no_root_squash,no_all_squash,secure"},
      {{"sec=krb5,insecure,sec=sys,secure"},
       "sync,sec=krb5,ro,root_squash,no_all_squash,insecure,sec=sys,ro,root_squash,no_all_squash,secure"},
      {{"rw, async,\t insecure, "}, "rw,async,insecure,root_squash,sec=sys"},
      {{"rw,xprtsec=none:tls", "reexport=auto-fsidnum"},
       "rw,sync,xprtsec=none:tls,reexport=auto-fsidnum,root_squash,sec=sys"},
      {{"sec=krb5,rw", "ro"}, "rw,sync,root_squash,sec=krb5"},
      {{"sec=krb5,rw", "sec=sys"}, "rw,sync,root_squash,sec=krb5:sys"},
      {{"rw", "sec=krb5"}, "rw,sync,root_squash,sec=krb5"},
      {{"no_wdelay,fsid=0", "nohide,wdelay"}, "ro,sync,no_wdelay,fsid=0,nohide,wdelay,root_squash,sec=sys"},
  };
  for (const OptionCase& c : cases) EXPECT_EQ(Read(c.lists).Text(), c.text) << c.lists.front();
}

TEST(ExportOptions, TextHasTheSameMeaning) {
  for (const char* list : {"", "rw,async", "sec=krb5,insecure,sec=sys,secure", "insecure,sec=krb5:sys",
                           "sec=krb5,rw,sec=sys,ro,no_root_squash,sec=krb5i,all_squash", "sec=none",
                           "sec=krb5p:sys,rw,anonuid=7,mp,refer=/a@b", "all_squash,sec=krb5,no_all_squash"}) {
    const ExportOptions options = Read({list});
    EXPECT_EQ(Read({options.Text()}), options) << list << " -> " << options.Text();
  }
}

TEST(ExportOptionReader, KeepsWhatItHasNoFieldFor) {
  for (const char* word : {"hide",
                           "nohide",
                           "wdelay",
                           "no_wdelay",
                           "subtree_check",
                           "no_subtree_check",
                           "auth_nlm",
                           "no_auth_nlm",
                           "secure_locks",
                           "insecure_locks",
                           "acl",
                           "no_acl",
                           "pnfs",
                           "no_pnfs",
                           "nordirplus",
                           "security_label",
                           "mp",
                           "mountpoint",
                           "mp=/a",
                           "mountpoint=",
                           "refer=",
                           "refer=/a@b:/c@d",
                           "replicas=x",
                           "fsid=0",
                           "fsid=root",
                           "fsid=0x10",
                           "fsid=-1",
                           "fsid=6ba7b810-9dad-11d1-80b4-00c04fd430c8",
                           "squash_uids=5",
                           "squash_uids=",
                           "squash_gids=5-",
                           "squash_uids=-5",
                           "squash_gids=0-99",
                           "xprtsec=tls:mtls",
                           "reexport=auto-fsidnum",
                           "new-option=",
                           "some_thing=a b"}) {
    EXPECT_THAT(Read({word}).others, testing::ElementsAre(word));
  }
}

TEST(ExportOptionReader, RefusesWhatExportfsStopsAt) {
  for (const char* word : {"foo",
                           "RW",
                           "",
                           "rw ",
                           "=x",
                           "a b=x",
                           "rw\t",
                           "sync=1",
                           "anonuid=",
                           "anonuid=x",
                           "anonuid=0x5",
                           "anongid=5x",
                           "fsid=",
                           "fsid=abc",
                           "fsid=5x",
                           "fsid=6ba7b8109dad11d180b400c04fd430c",
                           "sec=",
                           "sec=foo",
                           "sec=sys:",
                           "sec=:sys",
                           "sec=SYS",
                           "squash_uids=x",
                           "squash_uids=1-2-3",
                           "mountpointx",
                           "replicas",
                           "rdirplus",
                           "map_identity"}) {
    ExportOptionReader reader;
    const Status status = reader.Apply(std::string("sync,") + word + ",async");
    EXPECT_EQ(status.code(), kSyntax) << word;
    EXPECT_THAT(status.reason(), HasSubstr("\"")) << word;
  }
}

}  // namespace
}  // namespace vorn

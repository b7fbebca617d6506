#include "exports_rule.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "current_box.h"
#include "temporary_root.h"

namespace vorn {
namespace {

using testing::HasSubstr;

const SquashAccounts kAccounts = {AccountIDs{1024, 100}, AccountIDs{65534, 65534}};

ExportEntry Entry(const std::string& options) {
  ExportOptionReader reader;
  EXPECT_TRUE(reader.Apply(options).ok()) << options;
  return {"host", reader.Options(), "host(" + options + ")"};
}

ExportRule Rule(const std::string& options) { return RuleOf(Entry(options), kAccounts); }

struct SquashCase {
  const char* options;
  std::int32_t squash;
};

TEST(RuleOf, ReadsTheSquashModes) {
  const SquashCase cases[] = {{"", VORNNFS_SQUASH_GUEST},
                              {"root_squash", VORNNFS_SQUASH_GUEST},
                              {"anonuid=1024,anongid=100", VORNNFS_SQUASH_ADMIN},
                              {"root_squash,anonuid=1024,anongid=100", VORNNFS_SQUASH_ADMIN},
                              {"anonuid=1024", VORNNFS_SQUASH_GUEST},
                              {"anonuid=1026,anongid=100", VORNNFS_SQUASH_GUEST},
                              {"no_root_squash", VORNNFS_SQUASH_ROOT},
                              {"no_root_squash,anonuid=1024,anongid=100", VORNNFS_SQUASH_ROOT},
                              {"all_squash", VORNNFS_SQUASH_ALL_ADMIN},
                              {"all_squash,anonuid=1024,anongid=100", VORNNFS_SQUASH_ALL_ADMIN},
                              {"no_root_squash,all_squash", VORNNFS_SQUASH_ALL_ADMIN},
                              {"sec=sys,sec=krb5,no_root_squash", VORNNFS_SQUASH_ROOT}};
  for (const SquashCase& c : cases) EXPECT_EQ(Rule(c.options).squash, c.squash) << c.options;
}

TEST(RuleOf, ReadsNoAdministratorWhereTheBoxHasNone) {
  const SquashAccounts nobody;
  EXPECT_EQ(RuleOf(Entry("anonuid=0,anongid=0"), nobody).squash, VORNNFS_SQUASH_GUEST);
}

TEST(RuleOf, ReadsTheOtherOptions) {
  const ExportRule plain = Rule("");
  EXPECT_STREQ(plain.client, "host");
  EXPECT_EQ(plain.privilege, 0);
  EXPECT_EQ(plain.write_mode, VORNNFS_WRITE_SYNC);
  EXPECT_EQ(plain.insecure, 0);
  EXPECT_EQ(plain.crossmnt, 0);
  EXPECT_EQ(plain.sys, 1);
  EXPECT_EQ(plain.krb5 + plain.krb5i + plain.krb5p, 0);
  EXPECT_EQ(plain.next, nullptr);
  EXPECT_EQ(Rule("rw").privilege, 1);
  EXPECT_EQ(Rule("async").write_mode, VORNNFS_WRITE_ASYNC);
  EXPECT_EQ(Rule("insecure").insecure, 1);
  EXPECT_EQ(Rule("crossmnt").crossmnt, 1);
  const ExportRule flavors = Rule("sec=krb5p:krb5");
  EXPECT_EQ(flavors.sys, 0);
  EXPECT_EQ(flavors.krb5, 1);
  EXPECT_EQ(flavors.krb5i, 0);
  EXPECT_EQ(flavors.krb5p, 1);
}

TEST(RuleOf, ShowsTheWidestAccessOfAnyFlavour) {
  EXPECT_EQ(Rule("ro,sec=sys,sec=krb5,rw").privilege, 1);
  EXPECT_EQ(Rule("rw,sec=sys,sec=krb5,ro").privilege, 1);
  EXPECT_EQ(Rule("sec=sys,all_squash,sec=krb5,no_all_squash,no_root_squash").squash, VORNNFS_SQUASH_ROOT);
  EXPECT_EQ(Rule("sec=sys,insecure,sec=krb5,secure").insecure, 1);
}

struct ChangeCase {
  const char* name;
  const char* present;  // the options in the file
  const char* changed;  // the rule that is asked for, as options
  const char* after;
};

TEST(EntryOf, KeepsWhatTheRuleDoesNotSay) {
  const ChangeCase cases[] = {
      {"other options", "ro,fsid=5,no_wdelay", "rw", "rw,sync,fsid=5,no_wdelay,root_squash,sec=sys"},
      {"foreign account", "ro,anonuid=7,anongid=8", "rw", "rw,sync,root_squash,anonuid=7,anongid=8,sec=sys"},
      {"all to a foreign account", "all_squash,anonuid=7", "rw,all_squash",
       "rw,sync,root_squash,all_squash,anonuid=7,sec=sys"},
      {"another squash mode", "ro,anonuid=7,anongid=8", "no_root_squash", "ro,sync,no_root_squash,sec=sys"},
      {"administrator", "ro", "anonuid=1024,anongid=100", "ro,sync,root_squash,anonuid=1024,anongid=100,sec=sys"},
      {"everybody administrator", "ro", "all_squash",
       "ro,sync,root_squash,all_squash,anonuid=1024,anongid=100,sec=sys"},
      {"guest", "no_root_squash,anonuid=3", "ro", "ro,sync,root_squash,sec=sys"},
      {"order of flavours", "sec=krb5p:sys", "sec=sys:krb5:krb5p", "ro,sync,root_squash,sec=krb5p:sys:krb5"},
      {"flavour gone", "sec=krb5:sys", "sec=sys", "ro,sync,root_squash,sec=sys"},
      {"flavour without a field", "sec=none:sys", "sec=krb5", "ro,sync,root_squash,sec=none:krb5"},
      {"switches", "ro", "async,insecure,crossmnt", "ro,async,insecure,crossmnt,root_squash,sec=sys"},
  };
  for (const ChangeCase& c : cases) {
    const ExportEntry present = Entry(c.present);
    const auto entry = EntryOf(Rule(c.changed), &present, kAccounts);
    ASSERT_TRUE(entry.ok()) << c.name << ": " << entry.status().reason();
    EXPECT_EQ(entry->options.Text(), c.after) << c.name;
    EXPECT_EQ(entry->word, "") << c.name;
    EXPECT_EQ(entry->client, "host") << c.name;
  }
}

// A client with root and write access over Kerberos from any port, and squashed and read-only over AUTH_SYS.
const char* const kMixed = "sec=krb5,rw,no_root_squash,insecure,sec=sys,ro,root_squash,all_squash,secure,anonuid=7";

struct FieldChange {
  const char* name;
  const char* present;
  std::int32_t ExportRule::*field;
  std::int32_t value;
  const char* after;  // the whole entry, or null if the change is refused
};

TEST(EntryOf, ChangesOneFieldAndNothingElseOfAnyFlavour) {
  const FieldChange cases[] = {
      {"write mode", kMixed, &ExportRule::write_mode, VORNNFS_WRITE_ASYNC,
       "async,anonuid=7,sec=krb5,rw,no_root_squash,no_all_squash,insecure,sec=sys,ro,root_squash,all_squash,secure"},
      {"crossmnt", kMixed, &ExportRule::crossmnt, 1,
       "sync,crossmnt,anonuid=7,sec=krb5,rw,no_root_squash,no_all_squash,insecure,"
       "sec=sys,ro,root_squash,all_squash,secure"},
      {"insecure ports closed", kMixed, &ExportRule::insecure, 0,
       "sync,anonuid=7,sec=krb5,rw,no_root_squash,no_all_squash,secure,sec=sys,ro,root_squash,all_squash,secure"},
      {"read-only", kMixed, &ExportRule::privilege, 0,
       "sync,anonuid=7,sec=krb5,ro,no_root_squash,no_all_squash,insecure,sec=sys,ro,root_squash,all_squash,secure"},
      {"the narrower flavour goes", kMixed, &ExportRule::sys, 0, "rw,sync,insecure,no_root_squash,anonuid=7,sec=krb5"},
      {"the wider flavour goes", kMixed, &ExportRule::krb5, 0, nullptr},
      {"another flavour", kMixed, &ExportRule::krb5p, 1, nullptr},
      {"squash mode guest", kMixed, &ExportRule::squash, VORNNFS_SQUASH_GUEST, nullptr},
      {"squash mode of all", kMixed, &ExportRule::squash, VORNNFS_SQUASH_ALL_ADMIN, nullptr},
      {"flavours differ in privilege only", "sec=krb5,rw,sec=sys,ro", &ExportRule::squash, VORNNFS_SQUASH_ROOT,
       "sync,sec=krb5,rw,no_root_squash,no_all_squash,secure,sec=sys,ro,no_root_squash,no_all_squash,secure"},
      {"insecure", "sec=krb5,rw,sec=sys,ro", &ExportRule::insecure, 1,
       "sync,sec=krb5,rw,root_squash,no_all_squash,insecure,sec=sys,ro,root_squash,no_all_squash,insecure"},
      {"the field that differs becomes one", "sec=krb5,rw,sec=sys,ro", &ExportRule::privilege, 0,
       "ro,sync,root_squash,sec=krb5:sys"}};
  for (const FieldChange& c : cases) {
    const ExportEntry present = Entry(c.present);
    ExportRule rule = RuleOf(present, kAccounts);
    rule.*c.field = c.value;
    const auto entry = EntryOf(rule, &present, kAccounts);
    ASSERT_EQ(entry.ok(), c.after != nullptr) << c.name;
    EXPECT_EQ(entry.ok() ? 0 : entry.status().code(), c.after != nullptr ? 0 : kRefusedText) << c.name;
    EXPECT_EQ(entry.ok() ? entry->options.Text() : "", c.after != nullptr ? c.after : "") << c.name;
  }
}

TEST(EntryOf, LeavesAnEntryOfTheSameRuleAsItIs) {
  for (const char* options : {"", "rw,fsid=5", "sec=krb5,rw,sec=sys,ro", "all_squash,anonuid=7", "sec=none"}) {
    const ExportEntry present = Entry(options);
    const auto entry = EntryOf(Rule(options), &present, kAccounts);
    ASSERT_TRUE(entry.ok()) << options;
    EXPECT_EQ(*entry, present) << options;
    EXPECT_EQ(entry->word, present.word) << options;
  }
}

TEST(EntryOf, ReadsBackAsTheRule) {
  for (std::int32_t bits = 0; bits < 4 * 256; ++bits) {
    ExportRule rule = Rule("");
    rule.squash = bits & 3;
    std::int32_t* const fields[] = {&rule.privilege, &rule.write_mode, &rule.insecure, &rule.crossmnt,
                                    &rule.krb5,      &rule.krb5i,      &rule.krb5p,    &rule.sys};
    for (int i = 0; i < 8; ++i) *fields[i] = (bits >> (2 + i)) & 1;
    const auto entry = EntryOf(rule, nullptr, kAccounts);
    const bool has_flavor = rule.sys + rule.krb5 + rule.krb5i + rule.krb5p > 0;
    ASSERT_EQ(entry.ok(), has_flavor) << bits;
    if (!has_flavor) continue;
    const ExportRule back = RuleOf(Entry(entry->options.Text()), kAccounts);
    EXPECT_EQ(back.squash, rule.squash) << bits;
    const std::int32_t read[] = {back.privilege, back.write_mode, back.insecure, back.crossmnt,
                                 back.krb5,      back.krb5i,      back.krb5p,    back.sys};
    for (int i = 0; i < 8; ++i) EXPECT_EQ(read[i], *fields[i]) << bits << ", field " << i;
  }
}

struct RefusedRule {
  std::int32_t ExportRule::*field;
  std::int32_t value;
  const char* reason;
};

TEST(EntryOf, RefusesWhatTheFileCannotCarry) {
  const RefusedRule cases[] = {
      {&ExportRule::sys, 0, "no security flavour"}, {&ExportRule::squash, 4, "squash mode"},
      {&ExportRule::squash, -1, "squash mode"},     {&ExportRule::privilege, 7, "neither 0 nor 1"},
      {&ExportRule::write_mode, 2, "neither"},      {&ExportRule::insecure, -1, "neither"},
      {&ExportRule::crossmnt, 2, "neither"},        {&ExportRule::krb5p, 256, "neither"}};
  for (const RefusedRule& c : cases) {
    ExportRule rule = Rule("");
    rule.*c.field = c.value;
    const auto entry = EntryOf(rule, nullptr, kAccounts);
    EXPECT_EQ(entry.status().code(), kRefusedText) << c.reason;
    EXPECT_THAT(entry.status().reason(), HasSubstr(c.reason));
  }
}

TEST(EntryOf, RefusesASquashModeWhoseAccountIsMissing) {
  const SquashAccounts nobody;
  for (const std::int32_t mode : {VORNNFS_SQUASH_ADMIN, VORNNFS_SQUASH_GUEST, VORNNFS_SQUASH_ALL_ADMIN}) {
    ExportRule rule = Rule("");
    rule.squash = mode;
    const std::string reason = EntryOf(rule, nullptr, nobody).status().reason();
    const bool is_guest = mode == VORNNFS_SQUASH_GUEST;
    EXPECT_THAT(reason, HasSubstr(is_guest ? "no account \"nobody\"" : "no account \"admin\"")) << mode;
    EXPECT_THAT(reason, HasSubstr(is_guest ? "guest_account in" : "admin_account in")) << mode;
  }
  EXPECT_TRUE(EntryOf(Rule("no_root_squash"), nullptr, nobody).ok());
}

TEST(SquashAccounts, AreThoseThatTheSettingsName) {
  const TemporaryRoot root;
  root.Write("/etc/vorn/platform.conf", "[platform]\nadmin_account = boss\nguest_account = visitor\n");
  root.Write("/etc/passwd", "root:x:0:0::/:/bin/sh\nboss:x:7:8::/:/bin/sh\nbroken\nvisitor:x:9:10:::\n");
  const auto accounts = SquashAccounts::Load(CurrentBox());
  ASSERT_TRUE(accounts.ok());
  ASSERT_TRUE(accounts->admin && accounts->guest);
  EXPECT_EQ(accounts->admin->user, 7);
  EXPECT_EQ(accounts->admin->group, 8);
  EXPECT_EQ(accounts->guest->user, 9);
  EXPECT_EQ(accounts->guest->group, 10);
}

TEST(SquashAccounts, AreNoneWithoutAUserDatabase) {
  const TemporaryRoot root;
  const auto accounts = SquashAccounts::Load(CurrentBox());
  ASSERT_TRUE(accounts.ok());
  EXPECT_FALSE(accounts->admin || accounts->guest);
}

}  // namespace
}  // namespace vorn

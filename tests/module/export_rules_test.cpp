#include "export_rules.h"

#include <gtest/gtest.h>

#include <cstring>

#include "fake_platform.h"

namespace {

constexpr char kPlainRule[] = R"({"client": "*", "privilege": "ro", "root_squash": "root", "async": false,
                                  "insecure": false, "crossmnt": false, "security_flavor": {"kerberos": true}})";

// A record in which no field has a valid value.
ExportRule Garbage() {
  ExportRule record;
  std::memset(&record, 0x55, sizeof record);
  return record;
}

TEST(RuleFromJson, OverwritesTheWholeRecord) {
  ExportRule record = Garbage();
  RuleFromJson(Parse(kPlainRule), true, &record);
  EXPECT_STREQ(record.client, "*");
  for (const int32_t ExportRule::*field :
       {&ExportRule::privilege, &ExportRule::squash, &ExportRule::insecure, &ExportRule::crossmnt, &ExportRule::sys,
        &ExportRule::krb5i, &ExportRule::krb5p}) {
    EXPECT_EQ(record.*field, 0);
  }
  EXPECT_EQ(record.write_mode, VORNNFS_WRITE_SYNC);
  EXPECT_EQ(record.krb5, 1);
  EXPECT_EQ(record.next, nullptr);
}

TEST(RuleFromJson, AcceptsSysAloneWithoutKerberos) {
  ExportRule record = Garbage();
  RuleFromJson(Parse(kPlainRule), false, &record);
  EXPECT_EQ(record.sys, 1);
  for (const int32_t ExportRule::*field : {&ExportRule::krb5, &ExportRule::krb5i, &ExportRule::krb5p}) {
    EXPECT_EQ(record.*field, 0);
  }
}

TEST(RuleFromJson, GrantsTheLeastForAnUnknownWord) {
  Json::Value rule = Parse(kPlainRule);
  rule["privilege"] = rule["root_squash"] = "unknown";
  ExportRule record = Garbage();
  RuleFromJson(rule, true, &record);
  EXPECT_EQ(record.privilege, 0) << "read-only";
  EXPECT_EQ(record.squash, VORNNFS_SQUASH_GUEST);
}

}  // namespace

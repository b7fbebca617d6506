#include "audit.h"

#include <gtest/gtest.h>

namespace vorn::server {
namespace {

AuditRecord Example() {
  return {"alice", "10.0.0.1", "Api/v1/set", R"({"a":1})", 200, 0, std::chrono::microseconds(7)};
}

TEST(Audit, ALineSaysWhoFromWhereWhatAndHowItEnded) {
  AuditRecord record = Example();
  EXPECT_EQ(FormatAudit(record), R"(audit: alice 10.0.0.1 Api/v1/set {"a":1} succeeded, 7 us)");
  record.caller = "";
  record.code = 2301;
  EXPECT_EQ(FormatAudit(record), R"(audit: - 10.0.0.1 Api/v1/set {"a":1} failed with 2301, 7 us)");
}

TEST(Audit, ParametersAreOneLineOfBoundedLength) {
  Json::Value parameters;
  parameters["a"] = "line\nnext ü";
  EXPECT_EQ(AuditedParameters(parameters), R"({"a":"line\nnext \u00fc"})");
  parameters["a"] = std::string(100000, 'x');
  const std::string text = AuditedParameters(parameters);
  EXPECT_EQ(text.size(), kMostAuditedBytes + 3);
  EXPECT_EQ(text.substr(kMostAuditedBytes), "...");
}

}  // namespace
}  // namespace vorn::server

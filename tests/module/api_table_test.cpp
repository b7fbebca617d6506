#include "api_table.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <stdexcept>
#include <string>
#include <vector>

#include "entry_functions.h"
#include "fake_platform.h"

namespace {

constexpr APIRow kRows[] = {
    {"VORN.Core.FileServ.NFS", 1, "get", NFSGet},
    {"VORN.Core.FileServ.NFS", 1, "set", NFSSet},
    {"VORN.Core.FileServ.NFS", 2, "get", NFSGetV2},
    {"VORN.Core.FileServ.NFS", 2, "set", NFSSetV2},
    {"VORN.Core.FileServ.NFS.AdvancedSetting", 1, "get", NFSAdvGet},
    {"VORN.Core.FileServ.NFS.AdvancedSetting", 1, "set", NFSAdvSet},
    {"VORN.Core.FileServ.NFS.Kerberos", 1, "get", NFSKerberosGet},
    {"VORN.Core.FileServ.NFS.Kerberos", 1, "upload_key", NFSKerberosUploadKey},
    {"VORN.Core.FileServ.NFS.Kerberos", 1, "list", NFSKerberosList},
    {"VORN.Core.FileServ.NFS.IDMap", 1, "list", NFSIDMapList},
    {"VORN.Core.FileServ.NFS.IDMap", 1, "create", NFSIDMapCreate},
    {"VORN.Core.FileServ.NFS.IDMap", 1, "set", NFSIDMapSet},
    {"VORN.Core.FileServ.NFS.IDMap", 1, "delete", NFSIDMapDelete},
    {"VORN.Core.FileServ.NFS.SharePrivilege", 1, "load", NFSSharePrivilegeGet},
    {"VORN.Core.FileServ.NFS.SharePrivilege", 1, "save", NFSSharePrivilegeSet},
};

constexpr char kParameters[] = R"({"enable_nfs": false})";

TEST(APITable, IsTheSameAtEveryCall) {
  EXPECT_EQ(GetAPITable(), GetAPITable());
  EXPECT_EQ(GetAPITable(), static_cast<const void*>(gTable));
}

TEST(APITable, HoldsTheRowsInTheirOrderAndEndsWithZeros) {
  const APIRow* row = gTable;
  for (const APIRow& expected : kRows) {
    ASSERT_NE(row->api, nullptr) << expected.api;
    EXPECT_STREQ(row->api, expected.api);
    EXPECT_EQ(row->version, expected.version);
    EXPECT_STREQ(row->method, expected.method);
    EXPECT_EQ(row->handler, expected.handler) << expected.method;
    ++row;
  }
  EXPECT_EQ(row->api, nullptr);
  EXPECT_EQ(row->version, 0);
  EXPECT_EQ(row->method, nullptr);
  EXPECT_EQ(row->handler, nullptr);
}

TEST(EntryFunctions, AnswerExactlyOnce) {
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    FakePlatform platform;
    EXPECT_EQ(Call(row->handler, "{}").count, 1) << row->api << ' ' << row->method;
    EXPECT_TRUE(platform.live_objects.empty()) << row->api << ' ' << row->method;
  }
}

bool Contains(const std::vector<std::string>& calls, const std::string& operation) {
  return std::find(calls.begin(), calls.end(), operation) != calls.end();
}

// Whether the entry function calls `operation` when nothing throws.
bool Uses(const APIRow& row, const char* operation) {
  FakePlatform platform;
  Call(row.handler, kParameters);
  return Contains(platform.calls, operation);
}

// Runs the entry function while `operation` throws, and returns whether the same exception left it.
bool Propagates(const APIRow& row, const char* operation) {
  FakePlatform platform;
  platform.Throw(operation);
  bool has_thrown = false;
  try {
    Call(row.handler, kParameters);
  } catch (const std::runtime_error& error) {
    has_thrown = true;
    EXPECT_STREQ(error.what(), "thrown on demand");
    EXPECT_EQ(platform.calls.back(), operation) << "nothing is called after the exception";
  }
  EXPECT_TRUE(platform.live_objects.empty()) << row.api << ' ' << row.method << ' ' << operation;
  return has_thrown;
}

TEST(EntryFunctions, PropagateAnExceptionAndLeaveNothingBehind) {
  for (const APIRow* row = gTable; row->api != nullptr; ++row) {
    EXPECT_NE(Uses(*row, "SetSuccess"), Uses(*row, "SetError")) << row->api << ' ' << row->method;
    for (const char* operation : {"GetParam", "SetSuccess", "SetError"}) {
      EXPECT_EQ(Propagates(*row, operation), Uses(*row, operation))
          << row->api << ' ' << row->method << ' ' << operation;
    }
  }
}

}  // namespace

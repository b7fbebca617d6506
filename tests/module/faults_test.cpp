// Memory exhaustion: every allocation that the module makes fails once. The exception leaves the entry function, and no
// object of the request is leaked. The test loads the module's binary on the fake platform. Allocations of the fake
// platform do not fail, so that it can continue to record calls.
//
// The tests of each method cover failing and throwing platform calls, and failures of malloc(3) and strdup(3).
#include <dlfcn.h>
#include <execinfo.h>
#include <gmock/gmock.h>

#include <array>
#include <cstdlib>
#include <cstring>
#include <iostream>
#include <memory>
#include <new>
#include <string>

#include "fake_platform.h"
#include "furnished_box.h"

namespace {

const void* g_module_base = nullptr;    // load address of the module
const void* g_platform_base = nullptr;  // load address of the fake platform
int g_fail_at = 0;                      // the number of the allocation that fails, from 1; 0: no allocation fails
int g_allocations = 0;                  // allocations of the module since g_fail_at was set

const void* BaseOf(const void* address) {
  Dl_info info{};
  return dladdr(address, &info) != 0 ? info.dli_fbase : nullptr;
}

// Returns whether the nearest caller that is either the module or the fake platform is the module. Libraries such as
// JsonCpp may be in between.
bool IsAskedByModule() {
  std::array<void*, 32> frames{};
  const int count = backtrace(frames.data(), static_cast<int>(frames.size()));
  for (int i = 0; i < count; ++i) {
    const void* const base = BaseOf(frames[static_cast<size_t>(i)]);
    if (base == g_platform_base) return false;
    if (base == g_module_base) return true;
  }
  return false;
}

bool FailsNow() {
  if (g_fail_at == 0) return false;
  const int fail_at = g_fail_at;
  g_fail_at = 0;  // backtrace(3) may allocate
  const bool fails = IsAskedByModule() && ++g_allocations == fail_at;
  g_fail_at = fails ? 0 : fail_at;
  return fails;
}

}  // namespace

// Not inlined: g++ reports a mismatched new and delete when it sees both bodies in one function.
[[gnu::noinline]] void* operator new(size_t size) {
  void* const memory = FailsNow() ? nullptr : std::malloc(size == 0 ? 1 : size);
  if (memory == nullptr) throw std::bad_alloc();
  return memory;
}
[[gnu::noinline]] void operator delete(void* memory) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, size_t /*size*/) noexcept { std::free(memory); }

namespace {

using testing::IsEmpty;

struct Method {
  const char* api;  // behind "VORN.Core.FileServ.NFS"
  int version;
  const char* name;
  int allocations;     // the smallest number of allocations that the request makes
  int code;            // the error code of its answer while memory lasts
  const char* params;  // parameters with which the request reaches its last step
};

// The methods in the order of gTable.
const Method kMethods[] = {
    {"", 1, "get", 7, 0, "{}"},
    {"", 1, "set", 1, 0,
     R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "a.domain.long.enough.for.the.heap",
         "read_size": 4096, "write_size": 4096, "unix_pri_enable": true})"},
    {"", 2, "get", 7, 0, "{}"},
    {"", 2, "set", 1, 0,
     R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "a.domain.long.enough.for.the.heap"})"},
    {".AdvancedSetting", 1, "get", 7, 0, "{}"},
    // This method and "save" allocate nothing until a failed request is logged: the port is in use, and the rules
    // cannot be written.
    {".AdvancedSetting", 1, "set", 9, 2303,
     R"({"enable_nfs": true, "read_size": 4096, "write_size": 4096, "unix_pri_enable": true,
         "custom_port_enable": true, "statd_port": 5000, "nlm_port": 5001})"},
    {".Kerberos", 1, "get", 3, 0, "{}"},
    {".Kerberos", 1, "upload_key", 1, 0,
     R"({"keytab_file_tmp": "/nowhere/a-name-that-does-not-fit-into-the-text-itself"})"},
    {".Kerberos", 1, "list", 14, 0, "{}"},
    {".IDMap", 1, "list", 19, 0, R"({"suggestion": true, "filter": "o"})"},
    {".IDMap", 1, "create", 9, 0,
     R"({"idmap": [{"kerberos_principal": "somebody.with.a.long.name@BOX", "local_name": "alice"},
                   {"kerberos_principal": "somebody.else.at.length@BOX", "local_name": "bob"}]})"},
    {".IDMap", 1, "set", 1, 0,
     R"({"id": "one.principal.of.length@BOX", "kerberos_principal": "two.principals.of.length@BOX",
         "local_name": "somebody-with-a-name-that-needs-the-heap"})"},
    {".IDMap", 1, "delete", 2, 0, R"({"id": ["one.principal.of.length@BOX"]})"},
    {".SharePrivilege", 1, "load", 17, 0, R"({"share_name": "data"})"},
    {".SharePrivilege", 1, "save", 11, 2302,
     R"({"share_name": "data", "rule": [{"client": "a.client.with.a.long.name.example",
        "privilege": "rw", "root_squash": "admin", "async": true, "insecure": true, "crossmnt": true,
        "security_flavor": {"sys": true, "kerberos": true}}]})"},
};

struct Unload {
  void operator()(void* library) const { dlclose(library); }
};

class Memory : public testing::Test {
 protected:
  void SetUp() override {
    module_.reset(dlopen(MODULE_PATH, RTLD_NOW | RTLD_LOCAL));
    ASSERT_NE(module_, nullptr) << dlerror();
    const auto get_table = reinterpret_cast<GetAPITableFunction>(dlsym(module_.get(), "GetAPITable"));
    ASSERT_NE(get_table, nullptr);
    table_ = static_cast<const APIRow*>(get_table());
    g_module_base = BaseOf(table_);
    g_platform_base = BaseOf(reinterpret_cast<const void*>(&KLIBCErrGet));
    ASSERT_NE(g_module_base, g_platform_base);
    std::array<void*, 1> warm_up{};
    backtrace(warm_up.data(), 1);  // loads the unwinder
  }

  static void FurnishBox(FakePlatform* platform) {
    Furnish(platform, 1);
    platform->mappings = {{"one.principal.of.length@BOX", "alice"}};
    platform->users = {"alice", "bob", "somebody-with-a-name-that-needs-the-heap"};
    platform->files = {"/etc/nfs/krb5.keytab"};
    platform->port_conflicts = {"nfs_nlm 5001"};
    platform->Fail("VORNNFSRuleExtSetAll");
    ExportRule rule{};
    std::strcpy(rule.client, "a.client.with.a.long.name.example");
    platform->rules = {rule};
    KeytabEntry key{};
    std::strcpy(key.principal, "nfs/a.box.with.a.long.name.example@BOX.EXAMPLE");
    platform->keytab = {key};
  }

  // Returns whether the request made `n` allocations, the last of which failed.
  static bool RunsOutAt(int n, const APIRow& row, const Method& method) {
    FakePlatform platform;
    FurnishBox(&platform);
    bool has_run_out = false;
    {
      VORN::APIRequest request(Parse(method.params));
      VORN::APIResponse response;
      g_allocations = 0;
      g_fail_at = n;
      try {
        row.handler(&request, &response);
      } catch (const std::bad_alloc&) {
        has_run_out = true;
      }
      EXPECT_EQ(has_run_out, g_fail_at == 0) << "an allocation failed, and no exception left " << method.name;
      has_run_out = has_run_out || (g_fail_at == 0);
      g_fail_at = 0;
      EXPECT_TRUE(has_run_out || response.error() == method.code) << method.name << ": " << response.error();
    }
    EXPECT_THAT(platform.live_objects, IsEmpty()) << method.name << ", allocation " << n;
    return has_run_out;
  }

  const APIRow* table_ = nullptr;

 private:
  std::unique_ptr<void, Unload> module_;
};

TEST_F(Memory, MayRunOutAtEveryAllocationOfEveryMethod) {
  const APIRow* row = table_;
  for (const Method& method : kMethods) {
    const std::string name = std::string("VORN.Core.FileServ.NFS") + method.api + " " + method.name;
    ASSERT_NE(row->api, nullptr) << name;
    ASSERT_EQ(std::string(row->api) + " " + row->method, name);
    ASSERT_EQ(row->version, method.version) << name;
    int count = 0;
    while (RunsOutAt(count + 1, *row, method)) ++count;
    std::cout << "  " << name << ": " << count << " allocations failed\n";
    EXPECT_GE(count, method.allocations) << name;
    ++row;
  }
  EXPECT_EQ(row->api, nullptr) << "a method without parameters";
}

}  // namespace

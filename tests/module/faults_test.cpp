// Memory that runs out, at every place where the module asks for some: the exception leaves the entry function, and
// nothing of the request stays behind. The module is the binary, on the fake platform; what others allocate in between
// does not fail, so that the fake can go on recording.
//
// Failing and throwing calls are tried in each method's own tests, malloc(3) and strdup(3) where they are used.
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

const void* g_module_base = nullptr;    // where the module is loaded
const void* g_platform_base = nullptr;  // and the fake platform
int g_fail_at = 0;                      // the module's n-th allocation fails; 0: none does
int g_allocations = 0;                  // that the module has made since

const void* BaseOf(const void* address) {
  Dl_info info{};
  return dladdr(address, &info) != 0 ? info.dli_fbase : nullptr;
}

// Whether the module, and not the platform below it, asked the library that asked for memory.
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

// Not inlined: where g++ sees both bodies at once it takes them for a mismatch.
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
  const char* name;
  const char* params;  // with which the request goes furthest
};

// As gTable has them.
const Method kMethods[] = {
    {"NFSGet", "{}"},
    {"NFSSet", R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "a.domain.long.enough.for.the.heap",
                   "read_size": 4096, "write_size": 4096, "unix_pri_enable": true})"},
    {"NFSGetV2", "{}"},
    {"NFSSetV2",
     R"({"enable_nfs": true, "enable_nfs_v4": true, "nfs_v4_domain": "a.domain.long.enough.for.the.heap"})"},
    {"NFSAdvGet", "{}"},
    {"NFSAdvSet", R"({"enable_nfs": true, "read_size": 4096, "write_size": 4096, "unix_pri_enable": true,
                      "custom_port_enable": true, "statd_port": 5000, "nlm_port": 5001})"},
    {"NFSKerberosGet", "{}"},
    {"NFSKerberosUploadKey", R"({"keytab_file_tmp": "/nowhere/a-name-that-does-not-fit-into-the-text-itself"})"},
    {"NFSKerberosList", "{}"},
    {"NFSIDMapList", R"({"suggestion": true, "filter": "o"})"},
    {"NFSIDMapCreate", R"({"idmap": [{"kerberos_principal": "somebody.with.a.long.name@BOX", "local_name": "alice"},
                                     {"kerberos_principal": "somebody.else.at.length@BOX", "local_name": "bob"}]})"},
    {"NFSIDMapSet", R"({"id": "one.principal.of.length@BOX", "kerberos_principal": "two@BOX", "local_name": "bob"})"},
    {"NFSIDMapDelete", R"({"id": ["one.principal.of.length@BOX"]})"},
    {"NFSSharePrivilegeGet", R"({"share_name": "data"})"},
    {"NFSSharePrivilegeSet", R"({"share_name": "data", "rule": [{"client": "a.client.with.a.long.name.example",
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
    g_module_base = BaseOf(dlsym(module_.get(), "gTable"));
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
    ExportRule rule{};
    std::strcpy(rule.client, "a.client.with.a.long.name.example");
    platform->rules = {rule};
    KeytabEntry key{};
    std::strcpy(key.principal, "nfs/a.box.with.a.long.name.example@BOX.EXAMPLE");
    platform->keytab = {key};
  }

  // Whether the request met the end of the memory at its n-th allocation.
  bool RunsOutAt(int n, const Method& method) {
    FakePlatform platform;
    FurnishBox(&platform);
    const auto entry =
        reinterpret_cast<void (*)(VORN::APIRequest*, VORN::APIResponse*)>(dlsym(module_.get(), method.name));
    bool has_run_out = false;
    {
      VORN::APIRequest request(Parse(method.params));
      VORN::APIResponse response;
      g_allocations = 0;
      g_fail_at = n;
      try {
        entry(&request, &response);
      } catch (const std::bad_alloc&) {
        has_run_out = true;
      }
      has_run_out = has_run_out || (g_fail_at == 0);
      g_fail_at = 0;
    }
    EXPECT_THAT(platform.live_objects, IsEmpty()) << method.name << ", allocation " << n;
    return has_run_out;
  }

 private:
  std::unique_ptr<void, Unload> module_;
};

TEST_F(Memory, MayRunOutAtEveryAllocationOfEveryMethod) {
  int total = 0;
  for (const Method& method : kMethods) {
    int count = 0;
    while (RunsOutAt(count + 1, method)) ++count;
    std::cout << "  " << method.name << ": " << count << " allocations failed\n";
    total += count;
  }
  std::cout << "  " << total << " in all " << std::size(kMethods) << " methods\n";
  EXPECT_GT(total, 50) << "the module is not seen to allocate";
}

}  // namespace

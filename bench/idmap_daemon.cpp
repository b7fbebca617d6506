// The cost of many mappings to a daemon of NFS: libnfsidmap with the method "vorn", beside libnfsidmap's own method
// "static" with the same mappings (the peer). With "static" each change is a start of two daemons.
#include <benchmark/benchmark.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <functional>
#include <string>

#include "compiled_idmap.h"
#include "current_box.h"
#include "mapping_file.h"
#include "temporary_root.h"

extern "C" {
#include <sys/types.h>
// Needs the types above, and says nothing of C++ itself.
#include <nfsidmap.h>
}

namespace {

constexpr char kFile[] = "/etc/idmapd.conf";
constexpr char kQuestion[] = "principal7@BOX.EXAMPLE";

double Seconds(const timeval& time) {
  return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
}

// The CPU time of a child that runs the function, which returns whether it succeeded.
double SecondsOfChild(const std::function<bool()>& body) {
  const pid_t child = fork();
  if (child == 0) _exit(body() ? 0 : 1);
  int status = -1;
  rusage usage{};
  if (child < 0 || wait4(child, &status, 0, &usage) != child || status != 0) std::abort();
  return Seconds(usage.ru_utime) + Seconds(usage.ru_stime);
}

// A daemon that starts and answers once. libnfsidmap reads its file once per process.
bool StartAndAnswer(std::string configuration) {
  char mechanism[] = "krb5";
  std::string question = kQuestion;
  uid_t user = 1;
  gid_t group = 1;
  return nfs4_init_name_mapping(configuration.data()) == 0 &&
         nfs4_gss_princ_to_ids(mechanism, question.data(), &user, &group) == 0 && user == 0;
}

// A root with so many mappings, all to root.
struct Box {
  Box(long count, const std::string& method) {
    std::string text =
        "[General]\nDomain = box.example\n[Translation]\nGSS-Methods = " + method + ",nsswitch\n[Static]\n";
    for (long i = 0; i < count; ++i) text += "principal" + std::to_string(i) + "@BOX.EXAMPLE = root\n";
    root.Write(kFile, text);
    root.Write("/etc/passwd", "root:x:0:0:root:/root:/bin/sh\n");
  }

  TemporaryRoot root;
};

void Compile() {
  if (!vorn::CompileIDMap(vorn::CurrentBox()).ok()) std::abort();
}

// libnfsidmap finds the plug-in of the build folder by a path that leads there from its own folder.
std::string DaemonSettings(const Box& box) {
  std::string text = box.root.Read(vorn::kDaemonSettingsFile).value_or("");
  text.replace(text.find("vorn,"), 4, "../../../../../../../.." VORN_PLUGIN);
  return text + "[vorn]\nMappings = " + box.root.At(vorn::kMappingTableFile) + "\n";
}

void Start(benchmark::State& state, long count) {
  const Box box(count, "vorn");
  Compile();
  box.root.Write("/settings", DaemonSettings(box));
  for (auto step : state)
    state.SetIterationTime(SecondsOfChild([&] { return StartAndAnswer(box.root.At("/settings")); }));
}

void StartOfPeer(benchmark::State& state, long count) {
  const Box box(count, "static");
  for (auto step : state) state.SetIterationTime(SecondsOfChild([&] { return StartAndAnswer(box.root.At(kFile)); }));
}

// From the stored change to the daemon's answer: compiling, and reading the table again.
void Change(benchmark::State& state, long count) {
  const Box box(count, "vorn");
  vorn::MappingFile table(box.root.At(vorn::kMappingTableFile));
  const std::string text = box.root.Read(kFile).value_or("");
  bool is_odd = false;
  for (auto step : state) {
    is_odd = !is_odd;
    box.root.Write(kFile, text + (is_odd ? "new@BOX.EXAMPLE = root\n" : ""));
    state.SetIterationTime(SecondsOfChild([&] {
      int error = 0;
      Compile();
      const vorn::MappingTable* current = table.Current(&error);
      return current != nullptr && current->Find(kQuestion) == "root";
    }));
  }
}

}  // namespace

int main(int argc, char** argv) {
  for (const long count : {100L, 1'000L, 4'000L}) {
    const std::string mappings = " with " + std::to_string(count) + " mappings";
    benchmark::RegisterBenchmark(("daemon starts" + mappings).c_str(), Start, count)->UseManualTime();
    benchmark::RegisterBenchmark(("daemon starts" + mappings + "/peer").c_str(), StartOfPeer, count)->UseManualTime();
    benchmark::RegisterBenchmark(("daemon follows a change" + mappings).c_str(), Change, count)->UseManualTime();
    benchmark::RegisterBenchmark(("daemon follows a change" + mappings + "/peer").c_str(), StartOfPeer, count)
        ->UseManualTime();
  }
  benchmark::RegisterBenchmark("daemon follows a change with 100000 mappings", Change, 100'000L)->UseManualTime();
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
}

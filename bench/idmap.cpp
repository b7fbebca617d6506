// The ID map's methods among many mappings and many users, on the Linux platform, each beside a floor:
// reading the same files, finding their lines, sorting the same keys and, where something is changed,
// rewriting the same bytes durably.
#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "entry_functions.h"
#include "files.h"
#include "temporary_root.h"

namespace {

constexpr const char* kMapFile = "/etc/idmapd.conf";
constexpr const char* kUserFile = "/etc/passwd";

// A root with the given numbers of mappings and users.
struct Box {
  Box(long mappings, long users) {
    map = "[General]\nDomain = box.example\n\n[Static]\n";
    for (long i = 0; i < mappings; ++i) map += "principal" + std::to_string(i) + "@BOX.EXAMPLE = user0\n";
    map += "\n[Translation]\nGSS-Methods = static,nsswitch\n";
    std::string passwd;
    for (long i = 0; i < users; ++i) {
      const std::string number = std::to_string(i);
      passwd += "user" + number + ":x:" + std::to_string(1000 + i) + ":100:User " + number + ":/home/u:/bin/sh\n";
    }
    root.Write(kMapFile, map);
    root.Write(kUserFile, passwd);
    root.Write("/etc/login.defs", "UID_MIN 1000\nUID_MAX 10000000\n");
    root.Write("/etc/nfs/krb5.conf", "[libdefaults]\ndefault_realm = BOX.EXAMPLE\n");
  }

  TemporaryRoot root;
  std::string map;
};

void Answer(Entry entry, const Json::Value& params) {
  VORN::APIRequest request(params);
  VORN::APIResponse response;
  entry(&request, &response);
  if (!response.answered() || response.error() != 0) std::abort();
  benchmark::DoNotOptimize(response.data());
}

std::vector<std::string_view> Lines(std::string_view text) {
  std::vector<std::string_view> lines;
  for (std::size_t at = 0; at < text.size();) {
    const std::size_t end = std::min(text.find('\n', at), text.size());
    lines.push_back(text.substr(at, end - at));
    at = end + 1;
  }
  return lines;
}

vorn::FileText Read(const std::string& path) {
  auto file = vorn::ReadFile(path);
  if (!file.ok()) std::abort();
  return *file;
}

// Answers until the ID map is known: a file that was written a moment ago is read again.
void WarmUp(const Json::Value& params) {
  Answer(NFSIDMapList, params);
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  Answer(NFSIDMapList, params);
}

// The file does not change between the pages.
void PageOf50(benchmark::State& state, long mappings) {
  const Box box(mappings, 1);
  Json::Value params;
  params["limit"] = 50;
  params["offset"] = static_cast<int>(mappings / 2);
  WarmUp(params);
  for (auto step : state) Answer(NFSIDMapList, params);
}

void FilteredPageOf50(benchmark::State& state, long mappings) {
  const Box box(mappings, 1);
  Json::Value params;
  params["limit"] = 50;
  params["filter"] = "pal9";
  WarmUp(params);
  for (auto step : state) Answer(NFSIDMapList, params);
}

// The file is new for each page.
void FirstPageOf50(benchmark::State& state, long mappings) {
  const Box box(mappings, 1);
  Json::Value params;
  params["limit"] = 50;
  for (auto step : state) {
    state.PauseTiming();
    box.root.Write(kMapFile, box.map);
    state.ResumeTiming();
    Answer(NFSIDMapList, params);
  }
}

void PageFloor(benchmark::State& state, long mappings) {
  const Box box(mappings, 1);
  for (auto step : state) {
    const vorn::FileText file = Read(box.root.At(kMapFile));
    std::vector<std::string_view> keys = Lines(file.text);
    std::sort(keys.begin(), keys.end());
    benchmark::DoNotOptimize(keys.data());
  }
}

Json::Value NewMappings(long count) {
  Json::Value params;
  for (long i = 0; i < count; ++i) {
    Json::Value mapping;
    mapping["kerberos_principal"] = "new" + std::to_string(i) + "@BOX.EXAMPLE";
    mapping["local_name"] = "user" + std::to_string(i);
    params["idmap"].append(mapping);
  }
  return params;
}

void Create(benchmark::State& state, long items, long users) {
  const Box box(1000, users);
  const Json::Value params = NewMappings(items);
  for (auto step : state) {
    Answer(NFSIDMapCreate, params);
    state.PauseTiming();
    box.root.Write(kMapFile, box.map);
    state.ResumeTiming();
  }
}

void CreateFloor(benchmark::State& state, long items, long users) {
  const Box box(1000, users);
  for (auto step : state) {
    const vorn::FileText users_file = Read(box.root.At(kUserFile));
    std::vector<std::string_view> names = Lines(users_file.text);
    benchmark::DoNotOptimize(names.data());
    const vorn::FileText map = Read(box.root.At(kMapFile));
    const std::string text = map.text + std::string(static_cast<std::size_t>(items) * 30, 'x');
    if (!vorn::ReplaceFile(box.root.At(kMapFile), text, map.stamp).ok()) std::abort();
    state.PauseTiming();
    box.root.Write(kMapFile, box.map);
    state.ResumeTiming();
  }
}

void Suggest(benchmark::State& state, long users) {
  const Box box(0, users);
  Json::Value params;
  params["suggestion"] = true;
  params["limit"] = 50;
  for (auto step : state) Answer(NFSIDMapList, params);
}

void SuggestFloor(benchmark::State& state, long users) {
  const Box box(0, users);
  for (auto step : state) {
    const vorn::FileText file = Read(box.root.At(kUserFile));
    std::vector<std::string_view> names = Lines(file.text);
    benchmark::DoNotOptimize(names.data());
  }
}

template <typename... Sizes>
void Register(const std::string& name, void (*measured)(benchmark::State&, Sizes...),
              void (*floor)(benchmark::State&, Sizes...), Sizes... sizes) {
  benchmark::RegisterBenchmark(name.c_str(), measured, sizes...);
  benchmark::RegisterBenchmark((name + "/floor").c_str(), floor, sizes...);
}

}  // namespace

int main(int argc, char** argv) {
  for (const long mappings : {100L, 1'000L, 10'000L, 100'000L}) {
    const std::string name = "page of 50 out of " + std::to_string(mappings) + " mappings";
    Register("first " + name, FirstPageOf50, PageFloor, mappings);
    Register(name, PageOf50, PageFloor, mappings);
    Register("filtered " + name, FilteredPageOf50, PageFloor, mappings);
  }
  for (const long users : {10'000L, 100'000L}) {
    for (const long items : {1L, 100L, 1'000L}) {
      const std::string name = "create " + std::to_string(items) + " with " + std::to_string(users) + " users";
      Register(name, Create, CreateFloor, items, users);
    }
  }
  Register("suggestions out of 100000 users", Suggest, SuggestFloor, 100'000L);
  benchmark::Initialize(&argc, argv);
  benchmark::RunSpecifiedBenchmarks();
  benchmark::Shutdown();
}

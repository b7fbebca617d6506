// Load and save the rules of one share among many, through the contract, beside the Augeas library
// doing the same edit and beside the floor: reading the same bytes by their size, scanning them for line breaks and,
// for a save, rewriting them durably.
#include <augeas.h>
#include <benchmark/benchmark.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <ctime>
#include <memory>
#include <optional>
#include <string>
#include <thread>

#include "file_descriptor.h"
#include "files.h"
#include "nfsconf.h"
#include "temporary_root.h"

namespace {

constexpr const char* kFile = "/etc/exports";

struct FreeList {
  void operator()(ExportRuleList* list) const { VORNNFSRuleExtFree(list); }
};
using List = std::unique_ptr<ExportRuleList, FreeList>;

struct CloseAugeas {
  void operator()(augeas* tree) const { aug_close(tree); }
};

// A root whose exports file has `shares` shares with two clients each, and the path of the share in the middle.
struct Box {
  explicit Box(long shares) : path("/volume1/share" + std::to_string(shares / 2)) {
    std::string text = "# The shares of this box.\n";
    for (long i = 0; i < shares; ++i) {
      text += "/volume1/share" + std::to_string(i) + " 10.0.0.0/8(rw,async,no_subtree_check,no_root_squash)";
      text += " client" + std::to_string(i) + ".example(ro,sync,no_subtree_check,all_squash)\n";
    }
    root.Write(kFile, text);
    root.Write("/etc/passwd", "admin:x:1024:100::/:/bin/sh\nnobody:x:65534:65534::/:/bin/sh\n");
  }

  TemporaryRoot root;
  std::string path;
};

List Load(const Box& box) {
  ExportRuleList* list = nullptr;
  if (VORNNFSRuleExtGet(kFile, box.path.c_str(), &list) != 2) std::abort();
  return List(list);
}

// Changes one line of the file in place, as some editors do, and ensures that the file has a new version.
class Editor {
 public:
  explicit Editor(const Box& box)
      : file_(open(box.root.At(kFile).c_str(), O_WRONLY | O_CLOEXEC)),
        position_(static_cast<off_t>(box.root.Read(kFile)->rfind("(ro") + 2)) {}

  void Edit() {
    writable_ = !writable_;
    if (pwrite(file_.get(), writable_ ? "w" : "o", 1, position_) != 1) std::abort();
    ++times_[1].tv_nsec;
    futimens(file_.get(), times_);
  }

 private:
  const vorn::FileDescriptor file_;
  const off_t position_;
  bool writable_ = false;
  timespec times_[2] = {{0, UTIME_OMIT}, {1'000'000'000, 0}};
};

// A different line is changed before every load.
void LoadShare(benchmark::State& state, long shares) {
  const Box box(shares);
  Load(box);
  Editor editor(box);
  for (auto step : state) {
    editor.Edit();
    benchmark::DoNotOptimize(Load(box));
  }
}

// The first load of a process parses and indexes every line.
void LoadShareFirst(benchmark::State& state, long shares) {
  std::optional<Box> box;
  for (auto step : state) {
    state.PauseTiming();
    box.emplace(shares);
    state.ResumeTiming();
    benchmark::DoNotOptimize(Load(*box));
  }
}

// The file has been loaded before; the floor is one call of stat(2).
void LoadUnchangedShare(benchmark::State& state, long shares) {
  const Box box(shares);
  std::this_thread::sleep_for(std::chrono::milliseconds(20));  // a file of the current clock tick is not cached
  Load(box);
  for (auto step : state) benchmark::DoNotOptimize(Load(box));
}

void UnchangedFloor(benchmark::State& state, long shares) {
  const Box box(shares);
  for (auto step : state) benchmark::DoNotOptimize(vorn::StampOfFile(box.root.At(kFile)));
}

void SaveShare(benchmark::State& state, long shares) {
  const Box box(shares);
  const List list = Load(box);
  for (auto step : state) {
    list->first->privilege ^= 1;
    if (VORNNFSRuleExtSetAll(box.path.c_str(), list.get()) != 0) state.SkipWithError("not saved");
  }
}

std::string ReadAndScan(const std::string& path) {
  const vorn::FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC));
  struct stat stat {};
  if (fstat(file.get(), &stat) != 0) std::abort();
  std::string text(static_cast<std::size_t>(stat.st_size), '\0');
  if (read(file.get(), text.data(), text.size()) != stat.st_size) std::abort();
  std::size_t lines = 0;
  for (std::size_t at = 0; (at = text.find('\n', at)) != std::string::npos; ++at) ++lines;
  benchmark::DoNotOptimize(lines);
  return text;
}

void LoadFloor(benchmark::State& state, long shares) {
  const Box box(shares);
  Editor editor(box);
  for (auto step : state) {
    editor.Edit();
    benchmark::DoNotOptimize(ReadAndScan(box.root.At(kFile)));
  }
}

void LoadFirstFloor(benchmark::State& state, long shares) {
  const Box box(shares);
  for (auto step : state) benchmark::DoNotOptimize(ReadAndScan(box.root.At(kFile)));
}

void SaveFloor(benchmark::State& state, long shares) {
  const Box box(shares);
  for (auto step : state) {
    const std::string path = box.root.At(kFile);
    const vorn::Result<vorn::FileStamp> stamp = vorn::StampOfFile(path);
    if (!vorn::ReplaceFile(path, ReadAndScan(path), *stamp).ok()) state.SkipWithError("not saved");
  }
}

// Augeas, with only the lens for exports(5).
std::unique_ptr<augeas, CloseAugeas> OpenTree(const Box& box) {
  const unsigned flags = AUG_NO_MODL_AUTOLOAD | AUG_NO_LOAD;
  std::unique_ptr<augeas, CloseAugeas> tree(aug_init(box.root.directory().c_str(), nullptr, flags));
  if (!tree || aug_transform(tree.get(), "Exports", kFile, 0) != 0 || aug_load(tree.get()) != 0) std::abort();
  return tree;
}

std::string TreePath(const Box& box) { return "/files/etc/exports/dir[. = \"" + box.path + "\"]/client"; }

void LoadPeer(benchmark::State& state, long shares) {
  const Box box(shares);
  for (auto step : state) {
    const auto tree = OpenTree(box);
    if (aug_match(tree.get(), TreePath(box).c_str(), nullptr) != 2) std::abort();
  }
}

void SavePeer(benchmark::State& state, long shares) {
  const Box box(shares);
  const std::string option = TreePath(box) + "[1]/option[1]";
  bool writable = false;
  for (auto step : state) {
    const auto tree = OpenTree(box);
    const bool set = aug_set(tree.get(), option.c_str(), writable ? "rw" : "ro") == 0;
    if (!set || aug_save(tree.get()) != 0) state.SkipWithError("not saved");
    writable = !writable;
  }
}

using Measurement = void (*)(benchmark::State&, long);

benchmark::internal::Benchmark* Add(const std::string& name, Measurement measurement, long shares) {
  return benchmark::RegisterBenchmark(name.c_str(), measurement, shares)->Unit(benchmark::kMicrosecond)->UseRealTime();
}

void Register(const std::string& name, Measurement measured, Measurement floor, Measurement peer) {
  for (const long shares : {10L, 1000L, 10000L}) {
    const std::string full = name + "/" + std::to_string(shares);
    Add(full, measured, shares);
    Add(full + "/floor", floor, shares);
    Add(full + "/peer", peer, shares)->Iterations(1)->Repetitions(3);
  }
}

}  // namespace

int main(int argc, char** argv) {
  benchmark::Initialize(&argc, argv);
  Register("load", LoadShare, LoadFloor, LoadPeer);
  Register("save", SaveShare, SaveFloor, SavePeer);
  Add("load_first/10000", LoadShareFirst, 10000)->Iterations(20);
  Add("load_first/10000/floor", LoadFirstFloor, 10000);
  for (const long shares : {10L, 10000L}) {
    const std::string name = "load_unchanged/" + std::to_string(shares);
    Add(name, LoadUnchangedShare, shares);
    Add(name + "/floor", UnchangedFloor, shares);
  }
  benchmark::RunSpecifiedBenchmarks();
}

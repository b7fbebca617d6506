// Processes that write without a pause are killed at random moments and started again. Every acknowledged change is
// stored, and a killed process does not block the others.
#include <gmock/gmock.h>
#include <sys/mman.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <csignal>
#include <cstring>
#include <iostream>
#include <memory>
#include <random>
#include <set>
#include <stdexcept>
#include <thread>
#include <vector>

#include "keytab_maker.h"
#include "nfsconf.h"
#include "processes.h"
#include "writes.h"

namespace {

using testing::IsEmpty;

constexpr int kKills = 200;
constexpr unsigned kSeed = 7;

struct Free {
  void operator()(_tag_nfs_id_map_* map) const { VORNNFSIDMapFree(map); }
  void operator()(KLIBSZHASH* hash) const { KLIBCSzHashFree(hash); }
  void operator()(ExportRuleList* list) const { VORNNFSRuleExtFree(list); }
};

// Memory that the writers share with their parent. It outlives a killed writer.
struct Board {
  std::atomic<bool> over{false};
  std::atomic<int> acknowledged[4]{};  // the steps of each writer, which count from 1

  static Board* Make() {
    void* memory = mmap(nullptr, sizeof(Board), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) throw std::runtime_error("no shared memory");
    return new (memory) Board;
  }
};

struct Unmap {
  void operator()(Board* board) const { munmap(board, sizeof(Board)); }
};

// ---------------------------------------------------------------------------------------------
// The changes of the writers, and the checks of their effects.

std::string Principal(int writer, int step) {
  return std::to_string(step) + "." + std::to_string(writer) + "@LAB.TEST";
}

std::string Share(int writer) { return "/volume1/share" + std::to_string(writer); }

std::string Client(int step) { return "10.0." + std::to_string(step / 256) + "." + std::to_string(step % 256); }

bool AddMapping(int writer, int step) {
  const std::unique_ptr<_tag_nfs_id_map_, Free> map(VORNNFSIDMapGet());
  if (map == nullptr) return false;
  if (KLIBCSzHashSetValue(&map->table, Principal(writer, step).c_str(), "alice") < 0) return false;
  return VORNNFSIDMapSet("/etc/idmapd.conf", map.get()) >= 0;
}

bool SaveRule(int writer, int step) {
  ExportRule rule{};
  Client(step).copy(rule.client, sizeof rule.client - 1);
  rule.sys = 1;
  ExportRuleList list{};
  list.first = &rule;
  return VORNNFSRuleExtSetAll(Share(writer).c_str(), &list) >= 0;
}

std::string Keytab(int step) { return EncodeFile({EncodeEntry("box" + std::to_string(step), "LAB.TEST", 17)}); }

bool ImportKeytab(const TemporaryRoot& root, int step) {
  root.Write("/upload", Keytab(step));
  return VORNNFSKeytabImport(root.At("/upload").c_str()) >= 0;
}

bool SaveSizes(int step) {
  const VornConf configuration;
  NFSConfRecord record{};
  if (VORNNFSConfGet(&record) < 0) return false;
  record.read_size = step;
  return VORNNFSConfSet(&record) >= 0;
}

std::set<std::string> StoredPrincipals() {
  std::unique_ptr<KLIBSZHASH, Free> hash(KLIBCSzHashAlloc(0));
  KLIBSZHASH* moved = hash.release();
  EXPECT_GE(VORNNFSStaticMapGet(&moved, nullptr), 0);
  hash.reset(moved);
  KLIBSZLIST* keys = KLIBCSzListAlloc(0);
  EXPECT_GE(KLIBCSzHashEnumKey(hash.get(), &keys), 0);
  std::set<std::string> principals;
  for (int i = 0; i < keys->count; ++i) principals.insert(KLIBCSzListGet(keys, i));
  KLIBCSzListFree(keys);
  return principals;
}

std::string ClientOf(const std::string& share) {
  ExportRuleList* list = nullptr;
  EXPECT_GE(VORNNFSRuleExtGet("/etc/exports", share.c_str(), &list), 0);
  const std::unique_ptr<ExportRuleList, Free> owner(list);
  return list == nullptr ? "" : list->first->client;
}

// ---------------------------------------------------------------------------------------------
// The writers.

class Writers {
 public:
  static constexpr int kCount = 4;
  static constexpr int kOfSettings = 3;  // the last one; all others write mappings and rules

  explicit Writers(const TemporaryRoot& root) : root_(root), board_(Board::Make()) {
    for (int writer = 0; writer < kCount; ++writer) Start(writer);
  }

  void Start(int writer) {
    processes_[writer] = std::make_unique<ChildProcess>([this, writer] { return Write(writer); });
  }

  int Acknowledged(int writer) const { return board_->acknowledged[writer]; }

  // Kills the writer `time` after its next acknowledged change.
  void KillLater(int writer, std::chrono::microseconds time) {
    const int before = Acknowledged(writer);
    ASSERT_TRUE(Eventually([&] { return Acknowledged(writer) > before; }));
    std::this_thread::sleep_for(time);
    processes_[writer]->Kill();
    EXPECT_EQ(processes_[writer]->Wait(), 128 + SIGKILL) << "a write failed";
  }

  void End() {
    board_->over = true;
    for (auto& process : processes_) EXPECT_EQ(process->Wait(), 0) << "a write failed";
  }

 private:
  bool Make(int writer, int step) const {
    if (writer == kOfSettings) return ImportKeytab(root_, step) && SaveSizes(step);
    return AddMapping(writer, step) && SaveRule(writer, step);
  }

  int Write(int writer) const {
    for (int step = Acknowledged(writer) + 1; !board_->over; ++step) {
      if (!Make(writer, step)) return 1;
      board_->acknowledged[writer] = step;
    }
    return 0;
  }

  const TemporaryRoot& root_;
  const std::unique_ptr<Board, Unmap> board_;
  std::unique_ptr<ChildProcess> processes_[kCount];
};

// Mappings are only added, so every mapping acknowledged before the read must be stored.
void ExpectAllMappings(const Writers& writers) {
  int acknowledged[Writers::kOfSettings];
  for (int writer = 0; writer < Writers::kOfSettings; ++writer) acknowledged[writer] = writers.Acknowledged(writer);
  const std::set<std::string> stored = StoredPrincipals();
  for (int writer = 0; writer < Writers::kOfSettings; ++writer) {
    for (int step = 1; step <= acknowledged[writer]; ++step) {
      EXPECT_EQ(stored.count(Principal(writer, step)), 1U) << Principal(writer, step);
    }
  }
}

// Expects that the files of each writer have the values of its last acknowledged step.
void ExpectLastSteps(const Writers& writers, const TemporaryRoot& root) {
  for (int writer = 0; writer < Writers::kOfSettings; ++writer) {
    EXPECT_EQ(ClientOf(Share(writer)), Client(writers.Acknowledged(writer))) << writer;
  }
  const int last = writers.Acknowledged(Writers::kOfSettings);
  EXPECT_TRUE(root.Read("/etc/nfs/krb5.keytab") == Keytab(last)) << last;
  NFSConfRecord record{};
  EXPECT_GE(VORNNFSConfGet(&record), 0);
  EXPECT_EQ(record.read_size, last);
  EXPECT_EQ(record.kerberos_principal, "box" + std::to_string(last) + "@LAB.TEST");
}

using Kills = Writes;

TEST_F(Kills, LoseNoAcknowledgedChangeUnderLoad) {
  const TemporaryRoot root;
  WriteAllFiles(root);
  Writers writers(root);
  std::mt19937 chance(kSeed);
  std::uniform_int_distribution<int> any_writer(0, Writers::kCount - 1);
  std::uniform_int_distribution<int> any_time(0, 3000);
  for (int kill = 0; kill < kKills && !HasFailure(); ++kill) {
    const int writer = any_writer(chance);
    writers.KillLater(writer, std::chrono::microseconds(any_time(chance)));
    ExpectAllMappings(writers);
    writers.Start(writer);
  }
  writers.End();
  ExpectAllMappings(writers);
  ExpectLastSteps(writers, root);
  for (const Change& change : AllChanges(root)) {
    EXPECT_GE(change.make(), 0) << change.name;
    EXPECT_THAT(Leftovers(root, change), IsEmpty()) << change.name;
  }
  int steps = 0;
  for (int writer = 0; writer < Writers::kCount; ++writer) steps += writers.Acknowledged(writer);
  std::cout << "  " << kKills << " kills, " << 2 * steps << " acknowledged changes, seed " << kSeed << "\n";
}

}  // namespace

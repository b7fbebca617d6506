// Changes of generated nfs.conf files, compared with the output of nfsconf(8) before and afterwards: a successful
// change has the requested effect and no other, a refused change leaves every byte, and the record has the values that
// the daemons read.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <map>
#include <optional>

#include "captured_log.h"
#include "foretold.h"
#include "generated_case.h"
#include "ini_judge.h"
#include "nfsconf.h"
#include "processes.h"
#include "temporary_root.h"

namespace {

constexpr char kMain[] = "/etc/nfs.conf";
constexpr char kOwn[] = "/etc/nfs.conf.d/vorn.conf";

struct Key {
  const char* section;
  const char* key;
};
constexpr Key kKeys[] = {{"nfsd", "vers3"},         {"nfsd", "vers4"},      {"nfsd", "vers4.0"},
                         {"nfsd", "vers4.1"},       {"nfsd", "vers4.2"},    {"nfsd", "threads"},
                         {"mountd", "manage-gids"}, {"statd", "port"},      {"lockd", "port"},
                         {"lockd", "udp-port"},     {"vorn", "read-size"},  {"vorn", "write-size"},
                         {"vorn", "custom-ports"},  {"vorn", "statd-port"}, {"vorn", "nlm-port"}};

bool IsSwitch(const std::string& key) {
  return key.compare(0, 4, "vers") == 0 || key == "manage-gids" || key == "custom-ports";
}

// ---------------------------------------------------------------------------------------------
// Files.

std::string KeyLine(Chance* chance) {
  const char* const switches[] = {"y", "n",     "yes",  "no",  "On",    "FALSE", "1",
                                  "0", "maybe", "$yes", "$no", "$gone", "$loop"};
  const char* const numbers[] = {"4000", "4001", "0",     "04000", "0xFA0", "2049x", "70000",
                                 "-1",   "many", "$four", "5000",  "$loop", "$"};
  const Key& key = chance->Of(kKeys);
  const std::string value = IsSwitch(key.key) ? chance->Of(switches) : chance->Of(numbers);
  const char* const forms[] = {"=", " = ", "\t=\t"};
  std::string line = std::string(key.key) + chance->Of(forms);
  if (chance->OneIn(6)) return "[" + std::string(key.section) + "]\n" + line + "\"" + value + "\" # note\n";
  if (chance->OneIn(12)) return "[" + std::string(key.section) + "]\n" + line + "\n";
  return "[" + std::string(key.section) + "]\n" + line + value + "\n";
}

std::string OtherLine(Chance* chance) {
  const char* const lines[] = {"# note\n",
                               "\n",
                               "[nfsd\n",
                               "[statd \"x\"]\n",
                               "[mountd \"x\"]\ninclude = part\n",
                               "[statd \"x\"]\ninclude = part\n",
                               "port = 4002\n",
                               "vers4 = n\n",
                               "[STATD]\n",
                               "include = part\n",
                               "include=-gone\n",
                               "manage-gids=y\n",
                               "[environment]\nyes = on\nno = $off\noff = n\nfour = 4004\n",
                               "[environment]\nLoop = $pool\npool = $loop\n",
                               "[environment \"x\"]\nloop = 4005\n"};
  return chance->Of(lines);
}

std::string FileText(Chance* chance) {
  std::string text;
  for (int i = chance->Below(6); i > 0; --i) text += chance->OneIn(3) ? OtherLine(chance) : KeyLine(chance);
  if (!text.empty() && chance->OneIn(4)) text.pop_back();
  if (chance->OneIn(25))
    text.insert(static_cast<std::size_t>(chance->Below(static_cast<int>(text.size()) + 1)), 1, '\0');
  return text;
}

GeneratedFiles MakeFiles(Chance* chance) {
  GeneratedFiles files = {{kMain, FileText(chance)}};  // nfsconf(8) reads nothing without it
  if (chance->OneIn(2)) files.emplace_back(kOwn, FileText(chance));
  if (chance->OneIn(3)) files.emplace_back("/etc/nfs.conf.d/local.conf", FileText(chance));
  if (chance->OneIn(3)) files.emplace_back("/etc/nfs.conf.d/zz.conf", FileText(chance));
  if (chance->OneIn(4)) {  // two names whose order as versions is not that of their characters
    files.emplace_back("/etc/nfs.conf.d/zz10.conf", FileText(chance));
    files.emplace_back("/etc/nfs.conf.d/zz9.conf", FileText(chance));
  }
  if (chance->OneIn(2)) files.emplace_back("/etc/part", FileText(chance));
  if (chance->OneIn(2)) files.emplace_back("/etc/nfs.conf.d/part", FileText(chance));
  return files;
}

// ---------------------------------------------------------------------------------------------
// The daemons' view.

using Values = std::map<std::string, std::string>;  // by "section key"

// nullopt if nfsconf(8) does not end.
std::optional<Values> AskNfsconf(const TemporaryRoot& root) {
  const std::optional<std::string> dump = DumpByNfsconf(root.At(kMain));
  if (!dump) return std::nullopt;
  Values values;
  for (const Key& key : kKeys) {
    const bool is_set = dump->find(" " + std::string(key.key) + " = ") != std::string::npos;
    std::string& value = values[std::string(key.section) + " " + key.key];
    if (!is_set) continue;
    const std::optional<std::string> read = GetByNfsconf(root.At(kMain), key.section, key.key);
    if (!read) return std::nullopt;
    value = *read;
  }
  return values;
}

// Reads a switch as conf_get_bool of nfs-utils does.
bool ReadSwitch(const std::string& text, bool fallback) {
  for (const char* word : {"1", "t", "true", "y", "yes", "on"}) {
    if (strcasecmp(text.c_str(), word) == 0) return true;
  }
  for (const char* word : {"0", "f", "false", "n", "no", "off"}) {
    if (strcasecmp(text.c_str(), word) == 0) return false;
  }
  return fallback;
}

// Reads a number as conf_get_num of nfs-utils does; a number that is not a port counts as missing.
int ReadPort(const std::string& text, int fallback) {
  if (text.empty()) return fallback;
  const int port = std::atoi(text.c_str());
  return port < 0 || port > 65535 ? fallback : port;
}

NFSConfRecord RecordByNfsconf(Values values) {
  NFSConfRecord record{};
  bool version4 = ReadSwitch(values["nfsd vers4"], true);
  for (const char* minor : {"nfsd vers4.0", "nfsd vers4.1", "nfsd vers4.2"}) {
    version4 = version4 || ReadSwitch(values[minor], false);
  }
  record.enable_nfs_v4 = version4 ? 1 : 0;
  record.unix_pri_enable = ReadSwitch(values["mountd manage-gids"], false) ? 1 : 0;
  const int statd = ReadPort(values["statd port"], 0);
  const int nlm = ReadPort(values["lockd port"], 0);
  const bool custom = statd != 0 || nlm != 0 || ReadSwitch(values["vorn custom-ports"], false);
  record.custom_port_enable = custom ? 1 : 0;
  record.statd_port = custom ? statd : ReadPort(values["vorn statd-port"], 0);
  record.nlm_port = custom ? nlm : ReadPort(values["vorn nlm-port"], 0);
  return record;
}

std::string Text(const NFSConfRecord& record) {
  std::string text;
  for (const std::int32_t field :
       {record.enable_nfs_v4, record.unix_pri_enable, record.custom_port_enable, record.statd_port, record.nlm_port}) {
    text += std::to_string(field) + " ";
  }
  return text;
}

// ---------------------------------------------------------------------------------------------
// Changes.

struct Change {
  const char* name;
  std::vector<std::string> keys;  // that it may change: sections, or "section key"
  void (*make)(NFSConfRecord*);
};

const Change kChanges[] = {
    {"nothing", {}, [](NFSConfRecord*) {}},
    {"version 4", {"nfsd vers4"}, [](NFSConfRecord* r) { r->enable_nfs_v4 = r->enable_nfs_v4 == 0 ? 1 : 0; }},
    {"permissions", {"mountd"}, [](NFSConfRecord* r) { r->unix_pri_enable = r->unix_pri_enable == 0 ? 1 : 0; }},
    {"a size", {"vorn read-size"}, [](NFSConfRecord* r) { r->read_size = 65536; }},
    {"statd's port", {"vorn", "statd"}, [](NFSConfRecord* r) { r->statd_port = 4100; }},
    {"the lock manager's port", {"vorn", "lockd"}, [](NFSConfRecord* r) { r->nlm_port = 4101; }},
    {"both ports", {"vorn", "statd", "lockd"}, [](NFSConfRecord* r) { std::swap(r->statd_port, r->nlm_port); }},
    {"custom ports",
     {"vorn", "statd", "lockd"},
     [](NFSConfRecord* r) { r->custom_port_enable = r->custom_port_enable == 0 ? 1 : 0; }},
};

bool MayChange(const Change& change, const std::string& key) {
  return std::any_of(change.keys.begin(), change.keys.end(),
                     [&](const std::string& prefix) { return key.compare(0, prefix.size(), prefix) == 0; });
}

std::string AllText(const TemporaryRoot& root, const GeneratedFiles& files) {
  std::string text;
  for (const auto& [path, content] : files) text += "--- " + path + "\n" + root.Read(path).value_or("(none)") + "\n";
  if (root.Read(kOwn)) text += "--- own\n" + *root.Read(kOwn);
  return text;
}

void ExpectEffect(const Change& change, const Values& before, Values after, const NFSConfRecord& wanted) {
  for (const auto& [key, value] : before) {
    if (!MayChange(change, key)) {
      EXPECT_EQ(after[key], value) << key;
    }
  }
  EXPECT_EQ(Text(RecordByNfsconf(after)), Text(wanted));
}

// No daemon starts with such files: a change has no effect, so it must be refused.
void ExpectRefusal(const TemporaryRoot& root, const GeneratedFiles& files) {
  const std::string text_before = AllText(root, files);
  NFSConfRecord record{};
  EXPECT_EQ(VORNNFSConfGet(&record), 0) << text_before;
  record.unix_pri_enable = record.unix_pri_enable == 0 ? 1 : 0;
  TakeLog();
  EXPECT_LT(VORNNFSConfSet(&record), 0) << text_before;
  EXPECT_THAT(LastText(TakeLog()), testing::ContainsRegex("(includes|refers to) itself")) << text_before;
  EXPECT_EQ(AllText(root, files), text_before);
}

// Returns whether the change succeeded.
bool RunCase(unsigned number) {
  Chance chance(number);
  const TemporaryRoot root;
  const GeneratedFiles files = MakeFiles(&chance);
  for (const auto& [path, text] : files) root.Write(path, text);
  const std::optional<Values> before = AskNfsconf(root);
  if (!before) {
    ExpectRefusal(root, files);
    return false;
  }
  const Change& change = chance.Of(kChanges);
  const std::string text_before = AllText(root, files);
  SCOPED_TRACE("case " + std::to_string(number) + ": " + change.name + "\n" + text_before);
  NFSConfRecord record{};
  if (VORNNFSConfGet(&record) < 0) {
    ADD_FAILURE() << "no record";
    return false;
  }
  EXPECT_EQ(Text(record), Text(RecordByNfsconf(*before))) << "what is read";
  change.make(&record);
  TakeLog();
  const bool done = ExpectForetold(root, [&record] { return VORNNFSConfSet(&record); }) >= 0;
  const std::vector<LogLine> log = TakeLog();
  SCOPED_TRACE((done ? "done\n" : "refused: " + LastText(log) + "\n") + AllText(root, files));
  if (!done) {
    EXPECT_EQ(AllText(root, files), text_before);
    return false;
  }
  ExpectEffect(change, *before, AskNfsconf(root).value_or(Values()), record);
  NFSConfRecord stored{};
  EXPECT_EQ(VORNNFSConfGet(&stored), 0);
  EXPECT_EQ(std::memcmp(&stored, &record, sizeof record), 0) << Text(stored);
  for (const auto& [path, text] : files) {
    const std::string stored_text = root.Read(path).value_or("(none)");
    EXPECT_TRUE(path == kOwn || stored_text == text) << path;
    EXPECT_EQ(Tail(stored_text), Tail(text)) << "a line that is ignored, of " << path;
  }
  return true;
}

TEST(NFSConfGenerator, AChangeHasItsOwnEffectForTheDaemonsAndNoOther) { RunCases(300, RunCase); }

}  // namespace

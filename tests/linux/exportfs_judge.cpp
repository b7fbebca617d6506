#include "exportfs_judge.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "private_namespaces.h"
#include "processes.h"
#include "requirements.h"

namespace vorn {
namespace {

namespace fs = std::filesystem;

[[maybe_unused]] const bool kRequired = !RunsInCI() || RequirePrograms({"exportfs"});

// The script's arguments are the folder with the files, and the folder to mount at /mnt or an empty string. The
// kernel's export features are those of Linux 6.1, so that exportfs also writes the options that older kernels do not
// keep per security flavour.
constexpr const char* kScript = R"(
  cd "$0"
  mount -t tmpfs tmpfs /var/lib/nfs
  mount -t tmpfs tmpfs /proc/fs
  mkdir /proc/fs/nfsd
  echo 0x3feff 0xf >/proc/fs/nfsd/export_features
  if [ -n "$1" ]; then mount --bind "$1" /mnt; else
    mount -t tmpfs tmpfs /mnt
    mkdir /mnt/a /mnt/b /mnt/c "/mnt/a b" "/mnt/b# "
  fi
  mkdir etc
  for name in ld.so.cache netconfig protocols services passwd group; do
    [ ! -e /etc/$name ] || cp -L /etc/$name etc/
  done
  echo hosts: files >etc/nsswitch.conf
  cp hosts etc/
  mount --bind etc /etc
  for set in [0-9]*.set; do
    rm -rf /etc/exports.d
    cp -r "$set" /etc/exports.d
    mv /etc/exports.d/own /etc/exports
    : >/var/lib/nfs/etab
    : >/var/lib/nfs/rmtab
    status=0
    exportfs -r 2>"$set/messages" || status=$?
    echo "$status" >"$set/status"
    cat /var/lib/nfs/etab >"$set/table"
  done
)";

void Write(const std::string& path, const std::string& text) { std::ofstream(path, std::ios::binary) << text; }

std::string Read(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

}  // namespace

ExportfsJudge::ExportfsJudge() {
  std::string folder = fs::temp_directory_path() / "exportfs.XXXXXX";
  if (mkdtemp(folder.data()) != nullptr) folder_ = folder;
}

ExportfsJudge::~ExportfsJudge() {
  std::error_code ignored;
  fs::remove_all(folder_, ignored);
}

std::string ExportfsJudge::Unavailable() const {
  const std::string missing = ProgramMissing("exportfs");
  return missing.empty() ? GetPrivateNamespaces().unavailable : missing;
}

std::vector<ExportfsVerdict> ExportfsJudge::Judge(const std::vector<std::string>& files,
                                                  const std::vector<std::string>& hosts) const {
  std::string known = "127.0.0.1 localhost\n";
  for (std::size_t i = 0; i < hosts.size(); ++i) known += "10.254.0." + std::to_string(i + 1) + " " + hosts[i] + "\n";
  std::vector<ExportsSet> sets;
  for (const std::string& file : files) sets.push_back({file, {}});
  return Run(sets, known, "");
}

std::vector<ExportfsVerdict> ExportfsJudge::JudgeSets(const std::vector<ExportsSet>& sets, const std::string& hosts,
                                                      const std::string& mnt) const {
  return Run(sets, hosts, mnt);
}

std::vector<ExportfsVerdict> ExportfsJudge::Run(const std::vector<ExportsSet>& sets, const std::string& hosts,
                                                const std::string& mnt) const {
  Write(folder_ + "/hosts", hosts);
  const auto name = [this](std::size_t i) { return folder_ + "/" + std::to_string(i) + ".set"; };
  for (std::size_t i = 0; i < sets.size(); ++i) {
    fs::create_directory(name(i));
    Write(name(i) + "/own", sets[i].file);
    for (const auto& [file, text] : sets[i].foreign) Write(name(i) + "/" + file, text);
  }
  std::vector<std::string> command = GetPrivateNamespaces().command;
  command.insert(command.end(), {"bash", "-euc", kScript, folder_, mnt});
  const bool ran = RunProgram(command).status == 0;
  std::vector<ExportfsVerdict> verdicts(sets.size());
  for (std::size_t i = 0; ran && i < sets.size(); ++i) {
    verdicts[i] = {std::stoi(Read(name(i) + "/status")), Read(name(i) + "/table"), Read(name(i) + "/messages")};
  }
  for (const auto& entry : fs::directory_iterator(folder_)) fs::remove_all(entry.path());
  return verdicts;
}

}  // namespace vorn

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

[[maybe_unused]] const bool kRequired = !RunsInCI() || RequirePrograms({"exportfs"});

// Its argument is the folder that holds the files.
constexpr const char* kScript = R"(
  cd "$0"
  mount -t tmpfs tmpfs /var/lib/nfs
  [ ! -d /etc/exports.d ] || mount -t tmpfs tmpfs /etc/exports.d
  mount --bind hosts /etc/hosts
  mount -t tmpfs tmpfs /mnt
  mkdir /mnt/a /mnt/b /mnt/c "/mnt/a b" "/mnt/b# "
  for file in [0-9]*.exports; do
    mount --bind "$file" /etc/exports
    : >/var/lib/nfs/etab
    : >/var/lib/nfs/rmtab
    status=0
    exportfs -r 2>"$file.messages" || status=$?
    echo "$status" >"$file.status"
    cp /var/lib/nfs/etab "$file.table"
    umount /etc/exports
  done
)";

void Write(const std::string& path, const std::string& text) { std::ofstream(path, std::ios::binary) << text; }

std::string Read(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

}  // namespace

ExportfsJudge::ExportfsJudge() {
  std::string folder = std::filesystem::temp_directory_path() / "exportfs.XXXXXX";
  if (mkdtemp(folder.data()) != nullptr) folder_ = folder;
}

ExportfsJudge::~ExportfsJudge() {
  std::error_code ignored;
  std::filesystem::remove_all(folder_, ignored);
}

std::string ExportfsJudge::Unavailable() const {
  const std::string missing = ProgramMissing("exportfs");
  return missing.empty() ? GetPrivateNamespaces().unavailable : missing;
}

std::vector<ExportfsVerdict> ExportfsJudge::Judge(const std::vector<std::string>& files,
                                                  const std::vector<std::string>& hosts) const {
  std::string known = "127.0.0.1 localhost\n";
  for (std::size_t i = 0; i < hosts.size(); ++i) known += "10.254.0." + std::to_string(i + 1) + " " + hosts[i] + "\n";
  Write(folder_ + "/hosts", known);
  const auto name = [this](std::size_t i) { return folder_ + "/" + std::to_string(i) + ".exports"; };
  for (std::size_t i = 0; i < files.size(); ++i) Write(name(i), files[i]);
  std::vector<std::string> command = GetPrivateNamespaces().command;
  command.insert(command.end(), {"bash", "-euc", kScript, folder_});
  const bool ran = RunProgram(command).status == 0;
  std::vector<ExportfsVerdict> verdicts(files.size());
  for (std::size_t i = 0; i < files.size(); ++i) {
    if (ran)
      verdicts[i] = {std::stoi(Read(name(i) + ".status")), Read(name(i) + ".table"), Read(name(i) + ".messages")};
    for (const char* kind : {"", ".status", ".table", ".messages"}) std::filesystem::remove(name(i) + kind);
  }
  return verdicts;
}

}  // namespace vorn

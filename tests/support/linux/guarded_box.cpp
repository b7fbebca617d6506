#include "guarded_box.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <functional>
#include <string_view>

#include "export_paths.h"
#include "exports_document.h"
#include "ini_document.h"
#include "unseen_characters.h"

namespace fs = std::filesystem;

namespace {

using Lines = std::vector<std::string>;

// Returns whether requests may change the line in this section.
using IsOurs = std::function<bool(const std::string& section, std::string_view line)>;

constexpr char kExports[] = R"(# /etc/exports: who may reach what. See exports(5).
#
# The render farm: both subnets, ask Jo before you change these.
/volume1/media  10.20.0.0/16(ro,async,no_subtree_check) \
                10.21.0.0/16(ro,async,no_subtree_check)

/volume1/data   10.0.0.0/8(rw,sync,no_subtree_check)	# ours
# nightly dumps, one machine only
"/volume1/backup" dump01.example.net(rw,sync,no_root_squash,no_subtree_check,fsid=42)
)";

constexpr char kIDMap[] = R"([General]

# set your own domain here, if it differs from FQDN minus hostname
Verbosity = 0
Domain = storage.example

[Mapping]
Nobody-User = nobody

[Translation]
Method = nsswitch
GSS-Methods = static,nsswitch

[Static]
# the machines' own principals, see the wiki
alice@STORAGE.EXAMPLE = alice

; nothing below this line
)";

constexpr char kRecord[] = R"(# The NFS settings of this box, kept by its management. Other lines here are left alone.
[nfsd]
# all of the rack's cores
threads = 64
vers4 = y

[mountd]
manage-gids = n

[vorn]
read-size = 8192
write-size = 8192
custom-ports = n

[statd]
name = box.storage.example

[lockd]
# asked for by the lab
graceperiod = 45
)";

struct File {
  const char* path;
  const char* text;
};

constexpr char kExportsPath[] = "/etc/exports";
constexpr char kIDMapPath[] = "/etc/idmapd.conf";
constexpr char kRecordPath[] = "/etc/nfs.conf.d/vorn.conf";

constexpr File kFiles[] = {
    {kExportsPath, kExports},
    {kIDMapPath, kIDMap},
    {kRecordPath, kRecord},
    {"/etc/nfs.conf", "[general]\n# pipefs-directory=/run/rpc_pipefs\n[nfsd]\nvers3=y\n"},
    {"/etc/nfs/krb5.conf", "[libdefaults]\n    default_realm = STORAGE.EXAMPLE\n"},
    {"/etc/login.defs", "UID_MIN 1000\nUID_MAX 60000\n"},
    {"/etc/passwd",
     "root:x:0:0:root:/root:/bin/bash\nadmin:x:999:999::/:/bin/false\nnobody:x:65534:65534::/:/bin/false\n"
     "alice:x:1000:1000:Alice:/home/alice:/bin/bash\nbob:x:1001:1001:Bob:/home/bob:/bin/bash\n"},
    {"/etc/vorn/platform.conf", "[platform]\nservice_engine = local\nkerberos = yes\nfirewall = no\n"},
    {"/etc/vorn/shares.conf", "[shares]\ndata = /volume1/data\nmedia = /volume1/media\n"},
    {"/volume1/data/README", ""},
    {"/volume1/media/README", ""},
};

// The files that requests may add to the box.
constexpr const char* kMayAppear[] = {"/etc/nfs/krb5.keytab", "/etc/systemd/system/nfs-server.service.d/vorn.conf",
                                      "/run/vorn/config.lock", "/run/vorn/service-nfsd.lock",
                                      "/var/lib/vorn/nfsd.state"};

std::string Folded(std::string_view text) {
  std::string folded(text);
  for (char& c : folded) c = static_cast<char>(std::tolower(static_cast<unsigned char>(c)));
  return folded;
}

std::string Trimmed(std::string_view text) {
  const std::size_t begin = text.find_first_not_of(" \t");
  return begin == std::string_view::npos ? ""
                                         : std::string(text.substr(begin, text.find_last_not_of(" \t") - begin + 1));
}

// ---------------------------------------------------------------------------------------------
// The owner of a line: the administrator or the requests.

bool IsExportOfOurs(const std::string& /*section*/, std::string_view line) {
  return line.substr(0, 14) == "/volume1/data " || line.substr(0, 14) == "/volume1/data\t";
}

// Returns "key = value" in lower case; nullopt for any other line.
std::string KeyOf(std::string_view line) {
  const std::size_t equals = line.find('=');
  const bool comment = line.substr(0, 1) == "#" || line.substr(0, 1) == ";" || line.substr(0, 1) == "[";
  return equals == std::string_view::npos || comment ? "" : Folded(Trimmed(line.substr(0, equals)));
}

bool IsMappingOfOurs(const std::string& section, std::string_view line) {
  const std::string key = KeyOf(line);
  if (section == "static") return !key.empty();
  return (section == "general" && key == "domain") || (section == "translation" && key == "gss-methods");
}

bool IsNumberOrSwitch(std::string_view value) {
  const auto fits = [](unsigned char c) { return std::isdigit(c) != 0 || c == 'y' || c == 'n'; };
  return !value.empty() && std::all_of(value.begin(), value.end(), fits);
}

bool IsSettingOfOurs(const std::string& section, std::string_view line) {
  constexpr const char* kKeys[] = {"nfsd vers4",         "nfsd vers4.0",    "nfsd vers4.1",      "nfsd vers4.2",
                                   "mountd manage-gids", "statd port",      "lockd port",        "lockd udp-port",
                                   "vorn read-size",     "vorn write-size", "vorn custom-ports", "vorn statd-port",
                                   "vorn nlm-port"};
  const std::string key = KeyOf(line);
  if (section == "vorn" && key == "kerberos-principal") return true;
  const auto same = [&](const char* known) { return section + " " + key == known; };
  return std::any_of(std::begin(kKeys), std::end(kKeys), same) &&
         IsNumberOrSwitch(Trimmed(line.substr(line.find('=') + 1)));
}

// ---------------------------------------------------------------------------------------------
// Checks of one file.

struct Sorted {
  Lines foreign;
  std::size_t ours = 0;
};

// A file of the administrator's ends with a line feed, so the last piece is empty.
Sorted Sort(const std::string& text, const IsOurs& is_ours) {
  Sorted sorted;
  std::string section;
  for (std::size_t begin = 0; begin <= text.size();) {
    const std::size_t end = std::min(text.find('\n', begin), text.size());
    const std::string line = text.substr(begin, end - begin);
    if (line.substr(0, 1) == "[") section = Folded(line.substr(1, line.find(']') - 1));
    if (is_ours(section, line)) {
      ++sorted.ours;
    } else {
      sorted.foreign.push_back(line);
    }
    begin = end + 1;
  }
  return sorted;
}

void CheckLines(const File& file, const std::string& now, const IsOurs& is_ours, std::size_t added, Lines* faults) {
  const Sorted before = Sort(file.text, is_ours);
  const Sorted after = Sort(now, is_ours);
  if (before.foreign != after.foreign)
    faults->push_back(std::string(file.path) + ": another's line is changed:\n" + now);
  if (after.ours > before.ours + added) faults->push_back(std::string(file.path) + ": a line too many:\n" + now);
  if (HasUnseenCharacters(now)) faults->push_back(std::string(file.path) + ": invisible characters");
}

void CheckExports(const File& file, const std::string& now, Lines* faults) {
  CheckLines(file, now, IsExportOfOurs, 0, faults);
  const vorn::ExportsDocument before(file.text);
  const vorn::ExportsDocument after(now);
  const auto lines = after.Lines();
  for (const vorn::ExportLine& line : *lines) {
    if (line.fault) faults->push_back("exports: " + line.fault->reason);
  }
  const vorn::ExportPaths paths;
  for (const char* path : {"/volume1/media", "/volume1/backup"}) {
    if (!(before.Entries(path, paths) == after.Entries(path, paths)))
      faults->push_back("exports: another's share is changed");
  }
}

Lines ForeignEntries(const vorn::IniDocument& document, const IsOurs& is_ours) {
  Lines entries;
  for (const char* section :
       {"general", "mapping", "translation", "static", "nfsd", "mountd", "vorn", "statd", "lockd"}) {
    for (const vorn::IniEntry& entry : document.Entries(section)) {
      const std::string line = entry.key + " = " + entry.value;
      if (!is_ours(section, line)) entries.push_back(line);
    }
  }
  return entries;
}

void CheckIni(const File& file, const std::string& now, const IsOurs& is_ours, std::size_t added, Lines* faults) {
  CheckLines(file, now, is_ours, added, faults);
  const auto before = vorn::IniDocument::Parse(file.text);
  const auto after = vorn::IniDocument::Parse(now);
  if (ForeignEntries(before, is_ours) != ForeignEntries(after, is_ours)) {
    faults->push_back(std::string(file.path) + ": another's setting is changed:\n" + now);
  }
}

void CheckFile(const File& file, const std::string& now, std::size_t mappings, Lines* faults) {
  const std::string_view path = file.path;
  if (path == kExportsPath) return CheckExports(file, now, faults);
  if (path == kIDMapPath) return CheckIni(file, now, IsMappingOfOurs, mappings, faults);
  constexpr std::size_t kMostSettings = 11;
  if (path == kRecordPath) return CheckIni(file, now, IsSettingOfOurs, kMostSettings, faults);
  faults->push_back(std::string(path) + ": changed, and no request's to change");
}

// ---------------------------------------------------------------------------------------------
// Checks of the whole box.

// Returns the path below the root of each file that the box did not have at first.
Lines NewFiles(const TemporaryRoot& root) {
  Lines found;
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(root.directory())) {
    if (entry.is_directory()) continue;
    const std::string path = entry.path().native().substr(root.directory().size());
    const auto same = [&](const File& file) { return path == file.path; };
    if (std::none_of(std::begin(kFiles), std::end(kFiles), same)) found.push_back(path);
  }
  return found;
}

}  // namespace

GuardedBox::GuardedBox() { Restore(); }

std::vector<std::string> GuardedBox::Faults(std::size_t mappings) const {
  Lines faults;
  for (const File& file : kFiles) {
    const auto now = root_.Read(file.path);
    if (!now) {
      faults.push_back(std::string(file.path) + ": gone");
    } else if (*now != file.text) {
      CheckFile(file, *now, mappings, &faults);
    }
  }
  for (const std::string& path : NewFiles(root_)) {
    const bool allowed = std::find(std::begin(kMayAppear), std::end(kMayAppear), path) != std::end(kMayAppear);
    if (!allowed) faults.push_back(path + ": left behind");
  }
  return faults;
}

bool GuardedBox::IsUntouched() const {
  return std::all_of(std::begin(kFiles), std::end(kFiles),
                     [&](const File& file) { return root_.Read(file.path) == file.text; });
}

void GuardedBox::Restore() const {
  for (const std::string& path : NewFiles(root_)) fs::remove(root_.At(path));
  for (const File& file : kFiles) {
    if (root_.Read(file.path) != file.text) root_.Write(file.path, file.text);
  }
}

#include "keytab_maker.h"

#include <cstdint>
#include <sstream>
#include <stdexcept>

#include "processes.h"
#include "requirements.h"
#include "temporary_root.h"

namespace {

[[maybe_unused]] const bool kRequired = RequirePrograms({"kadmin.local", "kdb5_util", "klist", "ktutil"});

std::string RunShell(const std::string& script) {
  const ProgramResult result = RunProgram({"sh", "-ec", script});
  if (result.status != 0) throw std::runtime_error(script + ": " + result.output + result.errors);
  return result.output;
}

void Append(std::string* bytes, std::uint32_t value, int size) {
  for (int shift = 8 * (size - 1); shift >= 0; shift -= 8) bytes->push_back(static_cast<char>(value >> shift & 0xFF));
}

void AppendText(std::string* bytes, const std::string& text) {
  Append(bytes, static_cast<std::uint32_t>(text.size()), 2);
  *bytes += text;
}

std::string Take(const TemporaryRoot& folder, const char* name) {
  auto content = folder.Read(name);
  if (!content) throw std::runtime_error(std::string("no ") + name);
  return std::move(*content);
}

}  // namespace

std::string MakeKeytab(const std::vector<MadeKey>& keys) {
  const TemporaryRoot folder;
  std::string commands;
  for (const MadeKey& key : keys) {
    commands += "addent -password -p " + key.principal + " -k " + std::to_string(key.version) + " -e " + key.enc_type +
                "\nsecret\n";
  }
  folder.Write("/commands", commands + "wkt " + folder.At("/keytab") + "\n");
  RunShell("ktutil <" + folder.At("/commands"));
  return Take(folder, "/keytab");
}

std::string MakeKeytabOfARealm() {
  const TemporaryRoot folder;
  const std::string place = folder.directory();
  folder.Write("/krb5.conf", "[libdefaults]\n default_realm = LAB.TEST\n");
  folder.Write("/kdc.conf", "[realms]\n LAB.TEST = {\n  database_name = " + place +
                                "/principal\n  key_stash_file = " + place + "/stash\n }\n");
  RunShell("export KRB5_CONFIG=" + place + "/krb5.conf KRB5_KDC_PROFILE=" + place + "/kdc.conf\n" +
           R"(kdb5_util create -s -P secret -r LAB.TEST
admin() { kadmin.local -q "$*"; }
types=aes256-cts-hmac-sha1-96:normal,aes128-cts-hmac-sha1-96:normal
for name in host gone nfs; do admin addprinc -randkey $name/box.example; done
admin ktadd -k )" +
           place + R"(/keytab -e $types host/box.example
admin ktadd -k )" +
           place + R"(/keytab -e $types gone/box.example
admin cpw -randkey nfs/box.example
admin ktadd -k )" +
           place + R"(/keytab -e $types nfs/box.example
admin ktremove -k )" +
           place + R"(/keytab gone/box.example all
)");
  return Take(folder, "/keytab");
}

std::string EncodeEntry(const std::string& component, const std::string& realm, int enc_type, int version) {
  std::string bytes;
  Append(&bytes, 1, 2);  // components
  AppendText(&bytes, realm);
  AppendText(&bytes, component);
  Append(&bytes, 1, 4);  // KRB5_NT_PRINCIPAL
  Append(&bytes, 0, 4);  // time
  Append(&bytes, static_cast<std::uint32_t>(version), 1);
  Append(&bytes, static_cast<std::uint32_t>(enc_type), 2);
  AppendText(&bytes, std::string(16, 'k'));
  return bytes;
}

std::string EncodeFile(const std::vector<std::string>& entries) {
  std::string bytes("\x05\x02");
  for (const std::string& entry : entries) {
    Append(&bytes, static_cast<std::uint32_t>(entry.size()), 4);
    bytes += entry;
  }
  return bytes;
}

namespace {

template <typename Number>
void AppendNative(std::string* bytes, Number number) {
  bytes->append(reinterpret_cast<const char*>(&number), sizeof number);
}

void AppendNativeText(std::string* bytes, const std::string& text) {
  AppendNative(bytes, static_cast<std::uint16_t>(text.size()));
  *bytes += text;
}

}  // namespace

std::string EncodeFirstVersion(const std::string& component, const std::string& realm, int enc_type) {
  std::string entry;
  AppendNative(&entry, std::uint16_t{2});  // the realm and the component
  AppendNativeText(&entry, realm);
  AppendNativeText(&entry, component);
  AppendNative(&entry, std::uint32_t{1});  // the time
  entry.push_back(1);                      // the version of the key
  AppendNative(&entry, static_cast<std::uint16_t>(enc_type));
  AppendNativeText(&entry, std::string(32, 'k'));
  std::string bytes("\x05\x01");
  AppendNative(&bytes, static_cast<std::int32_t>(entry.size()));
  return bytes + entry;
}

std::vector<std::string> ListedByKlist(const std::string& content) {
  const TemporaryRoot folder;
  folder.Write("/keytab", content);
  std::istringstream output(RunShell("klist -k -e " + folder.At("/keytab")));
  std::string line;
  for (int heading = 0; heading < 3; ++heading) std::getline(output, line);
  std::vector<std::string> keys;
  while (std::getline(output, line)) {
    const std::string deprecated = "DEPRECATED:";
    if (const auto at = line.find(deprecated); at != std::string::npos) line.erase(at, deprecated.size());
    keys.push_back(
        line.substr(line.find_first_not_of(' '), line.find_last_not_of(' ') + 1 - line.find_first_not_of(' ')));
  }
  return keys;
}

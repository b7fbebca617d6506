// Keytabs for tests: by MIT Kerberos' own tools, and byte by byte.
#ifndef VORN_TESTS_LINUX_KEYTAB_MAKER_H
#define VORN_TESTS_LINUX_KEYTAB_MAKER_H

#include <string>
#include <vector>

struct MadeKey {
  std::string principal;  // "nfs/box.example@LAB.TEST"
  int version;
  std::string enc_type;
};

// Returns the keytab that ktutil(1) writes for these keys, in their order.
std::string MakeKeytab(const std::vector<MadeKey>& keys);

// Returns a keytab that kadmin(1) exported from a realm. It has two keys of the host's principal and two of the NFS
// service's, the latter with version 3. The keys of a third principal between them were removed again.
std::string MakeKeytabOfARealm();

// One entry, and a whole file of such: one key of `enc_type` (a number) for a principal of one component.
std::string EncodeEntry(const std::string& component, const std::string& realm, int enc_type, int version = 1);
std::string EncodeFile(const std::vector<std::string>& entries);

// A file of version 0x0501 with one entry, in the byte order of this machine.
std::string EncodeFirstVersion(const std::string& component, const std::string& realm, int enc_type);

// Returns the entries that "klist -k -e" prints for a keytab: "3 nfs/box.example@LAB.TEST (aes256-cts-hmac-sha1-96)".
std::vector<std::string> ListedByKlist(const std::string& content);

#endif  // VORN_TESTS_LINUX_KEYTAB_MAKER_H

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

// What ktutil(1) writes for these keys, in their order.
std::string MakeKeytab(const std::vector<MadeKey>& keys);

// What an administrator gets from a realm of its own through kadmin(1): the host's principal and the NFS
// service's, each with two keys, the NFS service's in version 3, and one that was removed again in between.
std::string MakeKeytabOfARealm();

// One entry, and a whole file of such: one key of `enc_type` (a number) for a principal of one component.
std::string EncodeEntry(const std::string& component, const std::string& realm, int enc_type);
std::string EncodeFile(const std::vector<std::string>& entries);

// What "klist -k -e" prints for a keytab: "3 nfs/box.example@LAB.TEST (aes256-cts-hmac-sha1-96)".
std::vector<std::string> ListedByKlist(const std::string& content);

#endif  // VORN_TESTS_LINUX_KEYTAB_MAKER_H

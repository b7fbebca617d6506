// A box with a different value in every field of its NFS record, so that tests notice an exchanged field.
#ifndef VORN_TESTS_SUPPORT_FURNISHED_BOX_H
#define VORN_TESTS_SUPPORT_FURNISHED_BOX_H

#include <cstring>

#include "fake_platform.h"
#include "nfsconf.h"

inline void Furnish(FakePlatform* platform, int enabled = 0) {
  platform->record.read_size = 8192;
  platform->record.write_size = 16384;
  std::strcpy(platform->record.kerberos_principal, "nfs/box.example@EXAMPLE");
  platform->record.kerberos_principal[515] = '!';  // behind the end of the string; must be written back unchanged
  platform->record.enable_nfs_v4 = 1;
  platform->record.unix_pri_enable = 0;
  platform->record.statd_port = 4000;
  platform->record.nlm_port = 4001;
  platform->record.custom_port_enable = 1;
  platform->enabled = enabled;
}

inline bool SameRecord(const NFSConfRecord& a, const NFSConfRecord& b) { return std::memcmp(&a, &b, sizeof a) == 0; }

#endif  // VORN_TESTS_SUPPORT_FURNISHED_BOX_H

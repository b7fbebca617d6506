// The binary contract on this target: sizes and offsets of the records. The headers assert them at compile time; this
// test prints them, also on the ABI of the appliance.
#include <gtest/gtest.h>

#include <cstddef>
#include <cstdint>
#include <iostream>

#include "nfsconf.h"
#include "webapi.h"

namespace {

struct Measure {
  const char* name;
  std::size_t value;
  std::size_t on_32_bits;
  std::size_t on_64_bits;
};

const Measure kMeasures[] = {
    {"a row of the API table", sizeof(APIRow), 16, 32},
    {"the NFS configuration record", sizeof(NFSConfRecord), 544, 544},
    {"its kerberos_principal", offsetof(NFSConfRecord, kerberos_principal), 8, 8},
    {"its enable_nfs_v4", offsetof(NFSConfRecord, enable_nfs_v4), 524, 524},
    {"the export rule list", sizeof(ExportRuleList), 512, 520},
    {"its first rule", offsetof(ExportRuleList, first), 508, 512},
    {"an export rule", sizeof(ExportRule), 1064, 1072},
    {"its privilege", offsetof(ExportRule, privilege), 1024, 1024},
    {"its sys", offsetof(ExportRule, sys), 1056, 1056},
    {"its next rule", offsetof(ExportRule, next), 1060, 1064},
    {"the ID map's domain", offsetof(_tag_nfs_id_map_, domain), 0, 0},
    {"the ID map's table", offsetof(_tag_nfs_id_map_, table), 20, 40},
    {"a keytab entry's version", offsetof(KeytabEntry, version), 0, 0},
    {"its principal", offsetof(KeytabEntry, principal), 4, 4},
    {"its enc_type", offsetof(KeytabEntry, enc_type), 518, 518},
    {"its next entry", offsetof(KeytabEntry, next), 584, 584},
};

bool IsBigEndian() {
  const std::uint16_t number = 1;
  return *reinterpret_cast<const unsigned char*>(&number) == 0;
}

TEST(Layout, MatchesTheContract) {
  std::cout << 8 * sizeof(void*) << " bits, " << (IsBigEndian() ? "big" : "little") << "-endian\n";
  for (const Measure& measure : kMeasures) {
    std::cout << "  " << measure.name << ": " << measure.value << "\n";
    EXPECT_EQ(measure.value, sizeof(void*) == 4 ? measure.on_32_bits : measure.on_64_bits) << measure.name;
  }
}

}  // namespace

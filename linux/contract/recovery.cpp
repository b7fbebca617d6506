#include "recovery.h"

#include <chrono>
#include <iterator>
#include <utility>

#include "change_history.h"
#include "configuration_lock.h"
#include "current_box.h"
#include "error.h"
#include "exports_files.h"
#include "firewall_table.h"
#include "idmap.h"
#include "keytab.h"
#include "live_settings.h"
#include "nfs_record.h"
#include "shares.h"

namespace vorn {
namespace {

// Every file that the platform replaces.
constexpr const char* kFiles[] = {kExportsFile, kIDMapFile,    kNFSRecordFile, kKeytabFile,
                                  kDropInFile,  kFirewallFile, kSharesFile};

// A start must not wait for another program; the next change of a file removes its leftovers as well.
constexpr std::chrono::milliseconds kLockLimit{100};

Status ConfirmFiles(Box& box) {
  const ConfigurationLock lock(box, kLockLimit);
  Status first = lock.status();
  if (!first.ok()) return first;
  RealHistory().Recover({std::begin(kFiles), std::end(kFiles)});
  for (const char* file : kFiles) {
    Status status = box.Confirm(file);
    if (first.ok()) first = std::move(status);
  }
  return first;
}

}  // namespace
}  // namespace vorn

namespace VORN {

int RemoveLeftovers() { return vorn::ToResult(vorn::ConfirmFiles(vorn::CurrentBox())); }

}  // namespace VORN

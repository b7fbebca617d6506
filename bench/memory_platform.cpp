// The platform operations of the measured methods, in memory. They replace those of the fake platform, which would
// record every call: the benchmarks measure the module only. All other operations are the fake platform's.
#include "memory_platform.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>

#include "core.h"
#include "filesystem.h"
#include "nfsconf.h"
#include "share.h"
#include "webapi.h"

namespace {

NFSConfRecord g_record = {8192, 16384, "nfs/box.example@EXAMPLE", 1, 0, 4000, 4001, 1};

}  // namespace

const NFSConfRecord& StoredRecord() { return g_record; }

VornConf::VornConf() = default;
VornConf::~VornConf() = default;

namespace VORN {

APIRequest::APIRequest(Json::Value parameters) : parameters_(std::move(parameters)) {}
APIRequest::~APIRequest() = default;
Json::Value APIRequest::GetParam(const std::string& /*name*/, const Json::Value& /*fallback*/) const {
  return parameters_;
}

APIResponse::APIResponse() : answered_(false), error_(0) {}
APIResponse::~APIResponse() = default;

void APIResponse::SetSuccess(const Json::Value& data) {
  data_ = data;
  answered_ = true;
}

void APIResponse::SetError(int code, const Json::Value& details) {
  data_ = details;
  error_ = code;
  answered_ = true;
}

}  // namespace VORN

extern "C" {

int KLIBServiceIsEnabled(const char* /*service*/) { return 1; }

int VORNNFSConfGet(NFSConfRecord* record) {
  *record = g_record;
  return 0;
}

int VORNNFSConfSet(const NFSConfRecord* record) {
  g_record = *record;
  return 0;
}

// Always the same record, because its memory would be a cost of the platform.
_tag_nfs_id_map_* VORNNFSIDMapGet(void) {
  static std::string domain = kDomain;
  static _tag_nfs_id_map_ record = {};
  record.domain = domain.data();
  return &record;
}

void VORNNFSIDMapFree(_tag_nfs_id_map_* /*record*/) {}

struct VORNSHARE {};

int VORNShareGet(const char* /*name*/, VORNSHARE** share) {
  static VORNSHARE data;
  *share = &data;
  return 0;
}

void VORNShareFree(VORNSHARE* /*share*/) {}

const char* KLIBSharePathGet(const VORNSHARE* /*share*/) { return "/volume1/data"; }

int VORNFSHasMountPointType(const char* /*path*/, int /*type*/) { return 0; }

int VORNNFSSupportKerberos(void) { return 1; }

int VORNNFSRuleExtSetAll(const char* /*path*/, const ExportRuleList* /*list*/) { return 0; }

void VORNNFSRuleExtFree(ExportRuleList* list) {
  if (list == nullptr) return;
  for (ExportRule* rule = list->first; rule != nullptr;) {
    ExportRule* const next = rule->next;
    free(rule);
    rule = next;
  }
  free(list);
}

int KLIBServiceReload(const char* /*service*/) { return 0; }

// Formats a log line as the C library does, but does not send it.
void syslog(int /*priority*/, const char* format, ...) {
  char line[1024];
  va_list arguments;
  va_start(arguments, format);
  vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
}

void __syslog_chk(int priority, int /*flag*/, const char* format, ...) {  // NOLINT(bugprone-reserved-identifier)
  char line[1024];
  va_list arguments;
  va_start(arguments, format);
  vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  static_cast<void>(priority);
}
}

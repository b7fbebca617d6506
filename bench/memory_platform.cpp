// The operations that the measured methods call, in memory and without the fake platform's
// recording: what is left to measure is the module. Everything else is the fake's.
#include "memory_platform.h"

#include <syslog.h>

#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <utility>

#include "core.h"
#include "nfsconf.h"
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

_tag_nfs_id_map_* VORNNFSIDMapGet(void) {
  auto* const record = static_cast<_tag_nfs_id_map_*>(calloc(1, sizeof(_tag_nfs_id_map_)));
  record->domain = strdup(kDomain);
  return record;
}

void VORNNFSIDMapFree(_tag_nfs_id_map_* record) {
  free(record->domain);
  free(record);
}

// Formats as the C library does, and sends nothing.
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

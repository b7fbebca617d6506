#include "error.h"

#include <syslog.h>

#include "call.h"
#include "core.h"

namespace {

struct LastError {
  int code = 0;
  const char* file = "";
  int line = 0;
};

thread_local LastError last_error;

const char* BaseName(const char* path) {
  const char* slash = std::strrchr(path, '/');
  return slash == nullptr ? path : slash + 1;
}

// The reason may quote untrusted input; line breaks are replaced to prevent log injection.
std::string OnOneLine(std::string text) {
  for (char& c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') c = '?';
  }
  return text;
}

}  // namespace

namespace vorn {

int ToSilentResult(const Status& status) {
  if (status.ok()) return 0;
  last_error = {status.code(), BaseName(status.file()), status.line()};
  return -1;
}

int ToResult(const Status& status) {
  if (ToSilentResult(status) == 0) return 0;
  const std::string reason = OnOneLine(status.reason());
  syslog(LOG_ERR, "%s:%d %s", last_error.file, last_error.line, reason.c_str());
  if (VORN::CallContext* call = VORN::CallContext::Current()) call->AddReason(reason);
  return -1;
}

}  // namespace vorn

int KLIBCErrGet() { return last_error.code; }
const char* KLIBCErrorGetFile() { return last_error.file; }
int KLIBCErrorGetLine() { return last_error.line; }

// Logging: syslog(3) with priority LOG_ERR. Every line begins with the source name and the line number.
#ifndef VORN_SRC_LOG_H
#define VORN_SRC_LOG_H

#include <syslog.h>

#include "handler.h"

// The current call site. Each source file defines its name as the constant `kSource`.
#define HERE \
  CallSite { kSource, __LINE__ }

// LOG_ERROR logs for the current line. LOG_ERROR_AT logs for a given call site; shared code uses it
// (docs/decisions/0002). Texts are never changed: docs/decisions/0020.
#define LOG_ERROR_AT(site, format, ...) syslog(LOG_ERR, "%s:%d " format, (site).source, (site).line, ##__VA_ARGS__)
#define LOG_ERROR(format, ...) LOG_ERROR_AT(HERE, format, ##__VA_ARGS__)

#endif  // VORN_SRC_LOG_H

// The module's one way to log: the system log, priority "error", every line with its place.
#ifndef VORN_SRC_LOG_H
#define VORN_SRC_LOG_H

#include <syslog.h>

#include "handler.h"

// This place. The source file names itself in a constant `kSource`.
#define HERE \
  CallSite { kSource, __LINE__ }

// LOG_ERROR_AT is for code that several sources share: it logs for its caller's place.
#define LOG_ERROR_AT(site, format, ...) syslog(LOG_ERR, "%s:%d " format, (site).source, (site).line, ##__VA_ARGS__)
#define LOG_ERROR(format, ...) LOG_ERROR_AT(HERE, format, ##__VA_ARGS__)

#endif  // VORN_SRC_LOG_H

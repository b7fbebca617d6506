// The content of the platform of the benchmarks. The floors answer with the same values.
#ifndef VORN_BENCH_MEMORY_PLATFORM_H
#define VORN_BENCH_MEMORY_PLATFORM_H

#include "nfsconf.h"

inline constexpr char kDomain[] = "box.example";

const NFSConfRecord& StoredRecord();

#endif  // VORN_BENCH_MEMORY_PLATFORM_H

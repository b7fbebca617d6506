// The static mappings in idmapd.conf(5).
#ifndef VORN_LINUX_IDMAP_MAPPINGS_H
#define VORN_LINUX_IDMAP_MAPPINGS_H

#include "ini_document.h"
#include "lists.h"
#include "status.h"

namespace vorn {

// Makes [Static] hold the table's mappings and no others, and has them honoured as soon as there is
// one. Refuses, before anything is changed, what the file cannot carry: two principals that differ
// in case only among it, which its reader takes for one.
Status StoreMappings(const KLIBSZHASH& table, IniDocument* document);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_MAPPINGS_H

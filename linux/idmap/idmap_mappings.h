// The static mappings in the text of an idmapd.conf(5).
#ifndef VORN_LINUX_IDMAP_IDMAP_MAPPINGS_H
#define VORN_LINUX_IDMAP_IDMAP_MAPPINGS_H

#include "idmap.h"
#include "ini_document.h"
#include "status.h"

namespace vorn {

// Makes [Static] contain exactly these mappings, and enables the method "static" if there is one. Fails with
// kRefusedText, before anything is changed, for what the file cannot represent; this includes two principals that
// differ only in case, which libnfsidmap does not distinguish.
Status StoreMappings(const IDMappings& mappings, IniDocument* document);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_IDMAP_MAPPINGS_H

// The translation methods of idmapd.conf(5): which plug-ins of libnfsidmap map a principal.
#ifndef VORN_LINUX_IDMAP_TRANSLATION_METHODS_H
#define VORN_LINUX_IDMAP_TRANSLATION_METHODS_H

#include <string>
#include <vector>

#include "box.h"
#include "ini_document.h"
#include "ini_files.h"
#include "status.h"

namespace vorn {

// The methods that map principals, in their order: GSS-Methods, else Method, else "nsswitch".
std::vector<std::string> GSSMethods(const IniFiles& files);

// The method that the box has for static mappings: "vorn" if its plug-in is installed (see plugin/README.md), else
// libnfsidmap's own "static". Both read the same mappings.
std::string StaticMethod(const Box& box);

// Whether static mappings decide before any other method.
bool IsStaticFirst(const std::vector<std::string>& methods);

// Whether the daemons take static mappings from the compiled table only, so that they need none of [Static].
bool UseOnlyCompiledMappings(const IniFiles& files);

// Makes `method`, a StaticMethod(), the first of the methods in force, by the key GSS-Methods. The other method for
// static mappings is removed; the remaining ones keep their order. Fails with kSyntax if a method cannot be written
// back.
Status PutStaticFirst(const std::vector<std::string>& methods, const std::string& method, IniDocument* document);

// One sentence for each configured method whose plug-in is not installed on the box. libnfsidmap then refuses the
// whole file, and no principal is mapped. Empty if the box has no folder of plug-ins at all: then there is no
// libnfsidmap, or it is elsewhere.
std::vector<std::string> MissingPlugins(const Box& box, const IniFiles& files);

}  // namespace vorn

#endif  // VORN_LINUX_IDMAP_TRANSLATION_METHODS_H

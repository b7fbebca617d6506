// How the readers of nfs-utils treat a section with an argument, [name "argument"].
#ifndef VORN_LINUX_TEXT_SECTION_ARGUMENTS_H
#define VORN_LINUX_TEXT_SECTION_ARGUMENTS_H

namespace vorn {

// Whether a value in [name "argument"] removes an earlier value of the same key in [name]. Readers before
// nfs-utils 2.8.3 keep one value for both sections. Later readers keep one for each.
extern const bool kArgumentsHideValues;

}  // namespace vorn

#endif  // VORN_LINUX_TEXT_SECTION_ARGUMENTS_H

// The readers of nfs-utils before version 2.8.3.
#include "section_arguments.h"

const bool vorn::kArgumentsHideValues = true;

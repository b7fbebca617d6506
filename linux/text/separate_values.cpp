// The readers of nfs-utils from version 2.8.3 on.
#include "section_arguments.h"

const bool vorn::kArgumentsHideValues = false;

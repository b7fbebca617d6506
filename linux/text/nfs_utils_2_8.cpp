// nfs-utils from version 2.8.3 on.
#include "nfs_utils.h"

const bool vorn::kArgumentsHideValues = false;

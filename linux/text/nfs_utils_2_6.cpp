// nfs-utils before version 2.8.3; seen with 2.6.2.
#include "nfs_utils.h"

const bool vorn::kArgumentsHideValues = true;

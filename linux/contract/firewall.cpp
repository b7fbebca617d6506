#include "firewall.h"

#include "current_box.h"
#include "error.h"
#include "firewall_table.h"

int VORNFwRuleHup(void) { return vorn::ToResult(vorn::UpdateFirewall(vorn::CurrentBox())); }

// libvswitch.so of the null host. The calls that are measured with an output return the same every
// time, so that whoever called them can be asked what came back.

#include "vswitch/configuration.h"
#include "vswitch/queries.h"

#include "returns_at_once.h"

#include "vswitch_calls.inc"

static VSUplinks two_uplinks = {2, 2, {{{"nic0"}, 11}, {{"nic1"}, 12}}};

QEX_ReturnStatus VSDVS_DvPortIDToPortID(char const *switchName, char const *port, int *portID) {
  (void)switchName, (void)port;
  *portID = 50331650;
  return QEX_OK;
}

QEX_ReturnStatus VSQEX_GetVSInfo(char const *switchName, VSInfo *info) {
  (void)switchName;
  info->mtu = 1500;
  return QEX_OK;
}

QEX_ReturnStatus VSQEX_GetUplinks(char const *switchName, VSUplinks **uplinks) {
  (void)switchName;
  *uplinks = &two_uplinks;
  return QEX_OK;
}

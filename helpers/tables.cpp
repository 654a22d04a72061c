// Bodies of the methods of tables that queries return; see tables.h.

#include "helpers/tables.h"

#include <cstring>

#include "helpers/addresses.h"
#include "helpers/slots.h"

namespace {

template <typename Entry>
Entry copy_at(void *first, int index) {
  Entry entry;
  std::memcpy(&entry, element_at<Entry>(first, index), sizeof entry);
  return entry;
}

}  // namespace

extern "C" {

PyObject *mcast_filters_mac_at(VSMcastFilters *filters, int index) {
  return mac_address_text(element_at<qex_EthAddress>(filters + 1, index));
}

PyObject *mcast_filters_ipv4_at(VSMcastFilters *filters, int index) {
  return ipv4_address_text(element_at<qex_IPv4Address>(filters + 1, index));
}

PyObject *mcast_filters_ipv6_at(VSMcastFilters *filters, int index) {
  return ipv6_address_text(element_at<qex_IPv6Address>(filters + 1, index));
}

PyObject *mcast_filter_stats_ipv4_at(VSMcastFilterStats *stats, int index) {
  return ipv4_address_text(element_at<qex_IPv4Address>(stats + 1, index));
}

PyObject *mcast_filter_stats_ipv6_at(VSMcastFilterStats *stats, int index) {
  return ipv6_address_text(element_at<qex_IPv6Address>(stats + 1, index));
}

PyObject *mac_text(unsigned char const *address) {
  return mac_address_text(address);
}

VSMACEntry mac_entry_at(VSMACEntry *entries, int index) {
  return copy_at<VSMACEntry>(entries, index);
}

void mac_entry_set_address(VSMACEntry *entry, unsigned char const *address) {
  std::memcpy(entry->macAddress, address, sizeof entry->macAddress);
}

PyObject *mirror_session_ids_at(VSDVMirrorSessionIDs *ids, int index) {
  if (!index_is_valid(index, ids->numEntries)) {
    return nullptr;
  }
  return PyBytes_FromStringAndSize(*element_at<DVMirrorSID>(ids + 1, index), sizeof(DVMirrorSID));
}

qex_SwitchPortID *promisc_destination_at(VSPromiscSessionActiveDsts *destinations, int index) {
  return index_is_valid(index, destinations->numEntries)
             ? element_at<qex_SwitchPortID>(destinations + 1, index)
             : nullptr;
}

void promisc_set_destination_at(VSPromiscSessionActiveDsts *destinations, int index,
                                qex_SwitchPortID const *port) {
  qex_SwitchPortID *const destination = promisc_destination_at(destinations, index);
  if (destination != nullptr) {
    std::memcpy(destination, port, sizeof *port);
  }
}

}  // extern "C"

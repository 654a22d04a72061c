// Multicast filters and their statistics. Both are the library's and are released with
// VSQEX_FreeMemory.

%record(VSMcastFilters)
%record(VSMcastFilterStats)

%{
#include "vswitch/mcast_filters.h"
%}
%volatile_field(VSMcastFilterStats::updateTime, time)
%include "vswitch/mcast_filters.h"

%extend VSMcastFilters {
  PyObject *get_mac_entry(int index) { return mcast_filters_mac_at($self, index); }
  PyObject *get_ip_entry(int index) { return mcast_filters_ipv4_at($self, index); }
  PyObject *get_ipv6_entry(int index) { return mcast_filters_ipv6_at($self, index); }
}

%extend VSMcastFilterStats {
  PyObject *get_ip_entry(int index) { return mcast_filter_stats_ipv4_at($self, index); }
  PyObject *get_ipv6_entry(int index) { return mcast_filter_stats_ipv6_at($self, index); }
}

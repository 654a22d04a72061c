// The module's own definitions over the generator's stock frame, in its default mode: the same
// records, calls, methods and constants. The order is that of the module.

%module stock_surface

%include "frame.i"
%include "calls/facts.i"

%include "records/types.i"
%include "records/kernel.i"
%include "records/current_module.i"
%include "records/names.i"
%include "records/management.i"
%include "records/packets.i"
%include "records/links.i"
%include "records/switch_ports.i"
%include "records/socket_addresses.i"
%include "records/runtime_option_names.i"
%include "records/ports.i"
%include "records/mac_tables.i"
%include "records/device.i"
%include "records/mcast_filters.i"
%include "records/lags.i"
%include "records/runtime_options.i"
%include "records/mirror.i"
%include "records/policies.i"
%include "records/uplinks.i"
%include "calls/configuration.i"
%include "calls/queries.i"
%include "calls/state.i"

// _libvswitch: flat functions over the two libraries through which a host controls its virtual
// switches. This file is the table of contents; the order of its parts is the order in which the
// module installs constants and variables.

%module _libvswitch

// How the runtime is mended and made faster, and how values cross.
%include "frame/frame.i"

// Words for what C does not say of calls.
%include "calls/facts.i"

// The host kernel interface: scalars, names, management, packets, links, ports.
%include "records/types.i"
%include "records/kernel.i"
%include "records/current_module.i"
%include "records/names.i"
%include "records/management.i"
%include "records/packets.i"
%include "records/links.i"
%include "records/switch_ports.i"
%include "records/socket_addresses.i"

// The two libraries: the runtime state, what is configured, what the state holds.
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

// The calls.
%include "calls/configuration.i"
%include "calls/queries.i"
%include "calls/state.i"

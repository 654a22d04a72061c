// _libvswitch: flat functions over the two libraries through which a host controls its virtual
// switches. This file is the table of contents; the order of its parts is the order in which the
// module installs constants and variables.

%module _libvswitch

// The frame: what of the generator's runtime is mended and what is made faster, then how values cross.
// Each file states what must stand before it.
%include "frame/fixes/startup.i"
%include "frame/fixes/overloads.i"
%include "frame/fixes/pointer_objects.i"
%include "frame/speed/arguments.i"
%include "frame/speed/vector_calls.i"
%include "frame/speed/pointer_objects.i"
%include "frame/speed/memory.i"
%include "frame/speed/results.i"
%include "frame/typemaps/failures.i"
%include "frame/typemaps/call_trap.i"
%include "frame/typemaps/pointers.i"
%include "frame/typemaps/scalars.i"
%include "frame/typemaps/texts.i"
%include "frame/typemaps/records.i"
%include "frame/typemaps/arrays.i"
%include "frame/typemaps/results.i"
%include "frame/typemaps/constants.i"

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

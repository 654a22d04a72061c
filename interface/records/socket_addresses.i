// Socket addresses of the host, and the revision of its interface. The caller fills and frees the
// records; other records hold addresses by value.

%record(qex_SocketAddress)
%record(qex_SocketIPAddressAddr)
%record(qex_SocketIPAddress)
%union_record(qex_SocketIPv6AddressAddr___u6_addr)
%record(qex_SocketIPv6AddressAddr)
%record(qex_SocketIPv6Address)
%view_only(qex_SocketIPv6AddressAddr, __u6_addr)

%{
#include "qexapi/revision.h"
#include "qexapi/socket_addresses.h"
%}
%include "qexapi/socket_addresses.h"
%include "qexapi/revision.h"

// Packet headers, to be laid over raw frame bytes, and the constants of their protocols. The caller
// fills and frees them. Nothing is swapped: a header holds the bytes that are stored in it.

%record(qex_EthHdr)
%record(qex_VLANHdr)
%record(qex_ArpHdr)
%record(qex_IPv4Hdr)
%record(qex_IPv6Hdr)
%record(qex_IPv6ExtHdr)
%record(qex_ICMPHdr)
%record(qex_IGMPHdr)
%record(qex_IGMPv3QueryHdr)
%record(qex_IGMPv3GrpRecord)
%record(qex_IGMPv3ReportHdr)
%record(qex_MLDHdr)
%record(qex_MLDv2QueryHdr)
%record(qex_MLDv2GrpRecord)
%record(qex_MLDv2ReportHdr)
%record(qex_PIMHdr)
%record(qex_UDPHdr)
%record(qex_TCPHdr)
%record(qex_FenceHdr)
%record(qex_VXLANHdr)
%record(qex_GREHdr)
%record(qex_GeneveHdr)
%record(qex_GeneveOptionHdr)

// Lists whose length only the packet knows.
%view_only(qex_IGMPv3QueryHdr, sourcesIPv4)
%view_only(qex_IGMPv3GrpRecord, sourcesIPv4)
%view_only(qex_IGMPv3ReportHdr, record)
%view_only(qex_MLDv2QueryHdr, sourcesIPv6)
%view_only(qex_MLDv2GrpRecord, sourcesIPv6)
%view_only(qex_MLDv2ReportHdr, record)

%{
#include "qexapi/ethernet.h"
#include "qexapi/ip.h"
#include "qexapi/multicast.h"
#include "qexapi/packet_capture.h"
#include "qexapi/protocols.h"
#include "qexapi/transport.h"
#include "qexapi/tunnels.h"
%}
%include "qexapi/protocols.h"
%include "qexapi/ethernet.h"
%include "qexapi/ip.h"
%include "qexapi/multicast.h"
%include "qexapi/transport.h"
%include "qexapi/tunnels.h"
%include "qexapi/packet_capture.h"

// The mirror session table; see mirror.h.

#include "helpers/mirror.h"

#include <arpa/inet.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <span>

#include "helpers/exported.h"
#include "helpers/slots.h"

namespace {

/// The size of a table in the 32 signed bits that hosts compute it in, widened.
size_t table_size(int sessions, int entities) {
  auto const size = static_cast<qex_uint32>(entities) * sizeof(DVMirrorEntity) +
                    static_cast<qex_uint32>(sessions) * sizeof(DVMirrorSession) +
                    sizeof(DVMirrorSessionTable);
  // Fewer bytes than the header takes would be overrun by setting it.
  return std::max(static_cast<size_t>(static_cast<int>(static_cast<qex_uint32>(size))),
                  sizeof(DVMirrorSessionTable));
}

/// The type of an entity as a plain number: callers may store any, the enumeration holds only its
/// own.
int type_of(DVMirrorEntity const *entity) {
  int type = 0;
  std::memcpy(&type, &entity->type, sizeof type);
  return type;
}

/// A slot may be full, and then has no terminator.
void copy_text(std::span<char const> slot, std::span<char> text) {
  std::memcpy(text.data(), slot.data(), strnlen(slot.data(), slot.size()));
}

void print_address(DVMirrorIP const &ip, std::span<char> text) {
  int const family = ip.isIPv6 != 0 ? AF_INET6 : AF_INET;
  void const *const address = ip.isIPv6 != 0 ? static_cast<void const *>(&ip.ipv6) : &ip.ipv4;
  inet_ntop(family, address, text.data(), static_cast<socklen_t>(text.size()));
}

void parse_address(char const *text, DVMirrorIP &ip) {
  in_addr ipv4;
  in6_addr ipv6;
  if (inet_pton(AF_INET, text, &ipv4) == 1) {
    std::memcpy(&ip.ipv4, &ipv4, sizeof ipv4);
    ip.isIPv6 = 0;
  } else if (inet_pton(AF_INET6, text, &ipv6) == 1) {
    std::memcpy(&ip.ipv6, &ipv6, sizeof ipv6);
    ip.isIPv6 = 1;
  }
}

long decimal(char const *text) {
  return std::strtol(text, nullptr, 10);
}

}  // namespace

extern "C" {

EXPORTED DVMirrorSessionTable *alloc_dvmirror_session_table(int numSessions, int numEntities) {
  auto *const table =
      static_cast<DVMirrorSessionTable *>(std::calloc(1, table_size(numSessions, numEntities)));
  if (table != nullptr) {
    table->magicNum = static_cast<qex_uint32>(VS_DVMIRROR_MAGIC_NUM);
    table->numSessions = static_cast<qex_uint32>(numSessions);
    table->numEntities = static_cast<qex_uint32>(numEntities);
  }
  return table;
}

EXPORTED void free_dvmirror_session_table(DVMirrorSessionTable *table) {
  std::free(table);
}

DVMirrorSession *mirror_first_session(DVMirrorSessionTable *table) {
  return element_at<DVMirrorSession>(table + 1, 0);
}

DVMirrorSession *mirror_session_at(DVMirrorSessionTable *table, int index) {
  return index_is_valid(index, table->numSessions) ? element_at<DVMirrorSession>(table + 1, index)
                                                   : nullptr;
}

void mirror_set_session_at(DVMirrorSessionTable *table, int index, DVMirrorSession const *session) {
  DVMirrorSession *const target = mirror_session_at(table, index);
  if (target != nullptr) {
    std::memmove(target, session, sizeof *target);
  }
}

DVMirrorEntity *mirror_entity_at(DVMirrorSessionTable *table, int index) {
  auto *const first = element_at<DVMirrorSession>(table + 1, table->numSessions);
  return element_at<DVMirrorEntity>(first, index);
}

DVMirrorEntity *mirror_next_entity(DVMirrorEntity *entity) {
  return element_at<DVMirrorEntity>(entity, 1);
}

MirrorEntityText mirror_entity_text(DVMirrorEntity const *entity) {
  MirrorEntityText result = {};
  std::span<char> const text = result.text;
  switch (type_of(entity)) {
    case MIRROR_ENTTYPE_DVPORT:
      copy_text(entity->dvPortId, text);
      break;
    case MIRROR_ENTTYPE_UPLINK:
      copy_text(entity->uplink.string, text);
      break;
    case MIRROR_ENTTYPE_VLAN:
      std::snprintf(text.data(), text.size(), "%d", static_cast<int>(entity->vlan));
      break;
    case MIRROR_ENTTYPE_IP:
      print_address(entity->ip, text);
      break;
    case MIRROR_ENTTYPE_PORT:
      std::snprintf(text.data(), text.size(), "%d", static_cast<int>(entity->portId));
      break;
    default:
      break;
  }
  return result;
}

void mirror_set_entity_text(DVMirrorEntity *entity, char const *text) {
  switch (type_of(entity)) {
    case MIRROR_ENTTYPE_DVPORT:
      fill_slot(entity->dvPortId, text);
      break;
    case MIRROR_ENTTYPE_UPLINK:
      fill_slot(entity->uplink.string, text);
      entity->uplink.string[sizeof entity->uplink.string - 1] = '\0';
      break;
    case MIRROR_ENTTYPE_VLAN:
      entity->vlan = static_cast<qex_uint16>(decimal(text));
      break;
    case MIRROR_ENTTYPE_IP:
      parse_address(text, entity->ip);
      break;
    case MIRROR_ENTTYPE_PORT:
      entity->portId = static_cast<qex_uint32>(decimal(text));
      break;
    default:
      break;
  }
}

void MIRROR_ENCAP_TYPE(void) {}
void MIRROR_ASSERT(void) {}

}  // extern "C"

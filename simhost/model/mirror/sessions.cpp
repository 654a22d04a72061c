// Taking tables apart and putting them together: each session with its entities in one run.
#include "model/mirror/sessions.h"

#include <algorithm>
#include <set>
#include <string>
#include <vector>

#include "base/outcomes.h"
#include "model/lookup.h"
#include "model/properties/properties.h"
#include "model/vlans/vlans.h"
#include "storage/store.h"
#include "vswitch/properties.h"

namespace simhost {
namespace {

constexpr qex_uint32 kFlags = VS_DVMIRROR_FLAG_DST_NO_OUTPUT | VS_DVMIRROR_FLAG_DST_NO_INPUT |
                              VS_DVMIRROR_FLAG_DST_ORIG_VLAN | VS_DVMIRROR_FLAG_DST_ENCAP |
                              VS_DVMIRROR_FLAG_LEGACY | VS_DVMIRROR_FLAG_DISABLED |
                              VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR;
constexpr qex_uint32 kWildcards = VS_DVMIRROR_WILDCARD_VMM | VS_DVMIRROR_WILDCARD_PNIC |
                                  VS_DVMIRROR_WILDCARD_COS | VS_DVMIRROR_WILDCARD_TCPIP |
                                  VS_DVMIRROR_WILDCARD_TEST;

struct Session {
  DVMirrorSession record;
  std::vector<DVMirrorEntity> entities;
};

struct Table {
  DVMirrorVersion version = VS_DVMIRROR_VERSION_V3;
  std::vector<Session> sessions;
};

// The enumerations of a record from outside may hold any number.
template <typename Enumeration>
void check_within(Enumeration value, int last) {
  auto const number = static_cast<int>(value);
  if (number < 0 || number > last) {
    throw Refused(QEX_BAD_PARAM);
  }
}

void check_entity(DVMirrorEntity const &entity) {
  switch (static_cast<int>(entity.type)) {
    case MIRROR_ENTTYPE_DVPORT:
      text_in(entity.dvPortId);
      break;
    case MIRROR_ENTTYPE_UPLINK:
      text_in(entity.uplink.string);
      break;
    case MIRROR_ENTTYPE_VLAN:
      check_vlan(entity.vlan);
      break;
    case MIRROR_ENTTYPE_IP:
    case MIRROR_ENTTYPE_PORT:
      break;
    default:
      throw Refused(QEX_BAD_PARAM);
  }
}

void check_session(DVMirrorSession const &session) {
  if (text_in(session.sid).empty()) {
    throw Refused(QEX_BAD_PARAM);
  }
  text_in(session.dname);
  check_within(session.type, VS_DVMIRROR_SESSIONTYPE_ERMIRROR_SRC);
  check_within(session.uplinkFilter, MIRROR_UPLINK_FILTER_ALL_ENCAP);
  check_within(session.encapType, DVMIRROR_ENCAP_ERSPAN3);
  check_vlan(session.encapVlan);
  if ((session.flags & ~kFlags) != 0 || (session.wildIn & ~kWildcards) != 0 ||
      (session.wildOut & ~kWildcards) != 0) {
    throw Refused(QEX_BAD_PARAM);
  }
}

qex_uint64 entity_count(DVMirrorSession const &session) {
  return qex_uint64{session.numDstEntities} + session.numSrcInEntities + session.numSrcOutEntities;
}

void check_header(DVMirrorSessionTable const &header) {
  if (header.magicNum != VS_DVMIRROR_MAGIC_NUM) {
    throw Refused(QEX_BAD_PARAM);
  }
  if (header.numSessions > kMostMirrorSessions || header.numEntities > kMostMirrorEntities) {
    throw Refused(QEX_LIMIT_EXCEEDED);
  }
}

std::size_t sessions_size(DVMirrorSessionTable const &header) {
  return header.numSessions * sizeof(DVMirrorSession);
}

std::size_t entities_size(DVMirrorSessionTable const &header) {
  return header.numEntities * sizeof(DVMirrorEntity);
}

// Refuses whatever the host does not accept as a table.
Table parse(BytesView bytes) {
  auto const header = record_at<DVMirrorSessionTable>(bytes);
  check_header(header);
  auto const version = static_cast<int>(header.version);
  if (version < VS_DVMIRROR_VERSION_V1 || version > VS_DVMIRROR_VERSION_V3) {
    throw Refused(QEX_VERSION_MISMATCH_MAJOR);
  }
  auto const body = bytes.subspan(sizeof header);
  if (body.size() != sessions_size(header) + entities_size(header)) {
    throw Refused(QEX_BAD_PARAM);
  }
  auto const entities = records_of<DVMirrorEntity>(body.subspan(sessions_size(header)));
  std::for_each(entities.begin(), entities.end(), check_entity);
  Table table{.version = header.version, .sessions = {}};
  std::set<std::string> sids;
  for (auto const &record : records_of<DVMirrorSession>(body.first(sessions_size(header)))) {
    check_session(record);
    auto const count = entity_count(record);
    if (record.startIdx > entities.size() || count > entities.size() - record.startIdx) {
      throw Refused(QEX_BAD_PARAM);
    }
    if (!sids.emplace(text_in(record.sid)).second) {
      throw Refused(QEX_EXISTS);
    }
    auto const first = entities.begin() + record.startIdx;
    table.sessions.push_back({record, {first, first + static_cast<std::ptrdiff_t>(count)}});
  }
  return table;
}

Bytes written(Table const &table) {
  DVMirrorSessionTable header{};
  header.magicNum = VS_DVMIRROR_MAGIC_NUM;
  header.version = table.version;
  header.numSessions = static_cast<qex_uint32>(table.sessions.size());
  Bytes sessions;
  Bytes entities;
  for (auto [record, own] : table.sessions) {
    record.startIdx = header.numEntities;
    header.numEntities += static_cast<qex_uint32>(own.size());
    auto const head = bytes_of(record);
    sessions.insert(sessions.end(), head.begin(), head.end());
    auto const tail = std::as_bytes(std::span(own));
    entities.insert(entities.end(), tail.begin(), tail.end());
  }
  auto all = copied(bytes_of(header));
  all.insert(all.end(), sessions.begin(), sessions.end());
  all.insert(all.end(), entities.begin(), entities.end());
  return all;
}

void store_sessions(storage::Transaction &transaction, storage::Port const &port,
                    Table const &table) {
  set_property(transaction, owner_of(port), VSPROP_PORT_MIRROR_SESSIONS, written(table));
}

}  // namespace

void check_mirror_sessions(Setting const &setting) {
  parse(setting.value);
}

BytesView mirror_table_bytes(DVMirrorSessionTable const &table) {
  check_header(table);
  return {reinterpret_cast<std::byte const *>(&table),
          sizeof table + sessions_size(table) + entities_size(table)};
}

Bytes mirror_sessions_of(storage::Transaction &transaction, storage::Port const &port) {
  auto property = get_property(transaction, owner_of(port), VSPROP_PORT_MIRROR_SESSIONS);
  return property ? std::move(property->value) : written({});
}

void append_mirror_sessions(storage::Transaction &transaction, storage::Port const &port,
                            BytesView table) {
  auto added = parse(table);
  auto const before = get_property(transaction, owner_of(port), VSPROP_PORT_MIRROR_SESSIONS);
  if (before) {
    auto const old = parse(before->value);
    added.version = std::max(added.version, old.version);
    added.sessions.insert(added.sessions.begin(), old.sessions.begin(), old.sessions.end());
  }
  store_sessions(transaction, port, added);
}

void remove_mirror_session(storage::Transaction &transaction, storage::Port const &port,
                           std::string_view sid) {
  auto table = parse(mirror_sessions_of(transaction, port));
  if (std::erase_if(table.sessions, [&](Session const &session) {
        return text_in(session.record.sid) == sid;
      }) == 0) {
    throw Refused(QEX_NOT_FOUND);
  }
  if (table.sessions.empty()) {
    reset_property(transaction, owner_of(port), VSPROP_PORT_MIRROR_SESSIONS);
  } else {
    store_sessions(transaction, port, table);
  }
}

}  // namespace simhost

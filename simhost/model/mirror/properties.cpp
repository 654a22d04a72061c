// Taking tables apart and putting them together: each session with its entities in one run.
#include "model/mirror/properties.h"

#include <fmt/format.h>

#include <algorithm>
#include <set>
#include <span>
#include <string>

#include "model/mirror/sessions.h"

namespace simhost::mirror {
namespace {

constexpr qex_uint32 kFlags = VS_DVMIRROR_FLAG_DST_NO_OUTPUT | VS_DVMIRROR_FLAG_DST_NO_INPUT |
                              VS_DVMIRROR_FLAG_DST_ORIG_VLAN | VS_DVMIRROR_FLAG_DST_ENCAP |
                              VS_DVMIRROR_FLAG_LEGACY | VS_DVMIRROR_FLAG_DISABLED |
                              VS_DVMIRROR_FLAG_SRC_UPLINK_MIRROR;

// The enumerations of a record from outside may hold any number.
template <typename Access, typename Object>
void check_among(Object const &object, std::span<Word const> words) {
  if (!form::is_among(Access::load(object), words)) {
    refuse(QEX_BAD_PARAM);
  }
}

void check_entity(DVMirrorEntity const &entity) {
  switch (form::NumberField<&DVMirrorEntity::type>::load(entity)) {
    case MIRROR_ENTTYPE_DVPORT:
      text_in(entity.dvPortId);
      break;
    case MIRROR_ENTTYPE_UPLINK:
      text_in(entity.uplink.string);
      break;
    case MIRROR_ENTTYPE_VLAN:
      vlans::check_vlan(entity.vlan);
      break;
    case MIRROR_ENTTYPE_IP:
    case MIRROR_ENTTYPE_PORT:
      break;
    default:
      refuse(QEX_BAD_PARAM);
  }
}

void check_session(DVMirrorSession const &session) {
  if (text_in(session.sid).empty()) {
    refuse(QEX_BAD_PARAM);
  }
  text_in(session.dname);
  check_among<form::NumberField<&DVMirrorSession::type>>(session, kTypes);
  check_among<form::NumberField<&DVMirrorSession::uplinkFilter>>(session, kUplinkFilters);
  check_among<form::NumberField<&DVMirrorSession::encapType>>(session, kEncapsulations);
  vlans::check_vlan(session.encapVlan);
  auto const wildcards = form::all_bits(kWildcards);
  if ((session.flags & ~kFlags) != 0 || (session.wildIn & ~wildcards) != 0 ||
      (session.wildOut & ~wildcards) != 0) {
    refuse(QEX_BAD_PARAM);
  }
}

qex_uint64 entity_count(DVMirrorSession const &session) {
  return qex_uint64{session.numDstEntities} + session.numSrcInEntities + session.numSrcOutEntities;
}

std::size_t sessions_size(DVMirrorSessionTable const &header) {
  return header.numSessions * sizeof(DVMirrorSession);
}

std::size_t entities_size(DVMirrorSessionTable const &header) {
  return header.numEntities * sizeof(DVMirrorEntity);
}

void check_header(DVMirrorSessionTable const &header) {
  if (header.magicNum != VS_DVMIRROR_MAGIC_NUM) {
    refuse(QEX_BAD_PARAM);
  }
  if (header.numSessions > kMostSessions || header.numEntities > kMostEntities) {
    throw Refused(QEX_LIMIT_EXCEEDED,
                  fmt::format("there are at most {} mirror sessions, and {} entities of theirs",
                              kMostSessions, kMostEntities));
  }
}

// The session with its entities, which are those from its first on.
Session session_of(DVMirrorSession const &record, std::span<DVMirrorEntity const> entities) {
  if (record.startIdx > entities.size() ||
      entity_count(record) > entities.size() - record.startIdx) {
    refuse(QEX_BAD_PARAM);
  }
  auto rest = entities.subspan(record.startIdx);
  auto const take = [&](std::size_t count) {
    auto const taken = rest.first(count);
    rest = rest.subspan(count);
    return std::vector(taken.begin(), taken.end());
  };
  Session session{.record = record};
  session.to = take(record.numDstEntities);
  session.received_by = take(record.numSrcInEntities);
  session.sent_by = take(record.numSrcOutEntities);
  return session;
}

void append(Bytes &all, BytesView more) {
  all.insert(all.end(), more.begin(), more.end());
}

}  // namespace

BytesView table_bytes(DVMirrorSessionTable const &table) {
  check_header(table);
  return {reinterpret_cast<std::byte const *>(&table),
          sizeof table + sessions_size(table) + entities_size(table)};
}

Table Table::from(BytesView bytes) {
  auto const header = record_at<DVMirrorSessionTable>(bytes);
  check_header(header);
  auto const version = static_cast<int>(header.version);
  if (version < VS_DVMIRROR_VERSION_V1 || version > VS_DVMIRROR_VERSION_V3) {
    refuse(QEX_VERSION_MISMATCH_MAJOR);
  }
  auto const body = bytes.subspan(sizeof header);
  if (body.size() != sessions_size(header) + entities_size(header)) {
    refuse(QEX_BAD_PARAM);
  }
  auto const entities = records_of<DVMirrorEntity>(body.subspan(sessions_size(header)));
  std::for_each(entities.begin(), entities.end(), check_entity);
  Table table{.version = header.version};
  std::set<std::string> sids;
  for (auto const &record : records_of<DVMirrorSession>(body.first(sessions_size(header)))) {
    check_session(record);
    table.sessions.push_back(session_of(record, entities));
    if (!sids.emplace(text_in(record.sid)).second) {
      refuse(QEX_EXISTS);
    }
  }
  return table;
}

Bytes Table::to_bytes() const {
  DVMirrorSessionTable header{};
  header.magicNum = VS_DVMIRROR_MAGIC_NUM;
  header.version = version;
  header.numSessions = static_cast<qex_uint32>(sessions.size());
  Bytes records;
  Bytes entities;
  for (auto const &session : sessions) {
    auto record = session.record;
    record.startIdx = header.numEntities;
    record.numDstEntities = static_cast<qex_uint32>(session.to.size());
    record.numSrcInEntities = static_cast<qex_uint32>(session.received_by.size());
    record.numSrcOutEntities = static_cast<qex_uint32>(session.sent_by.size());
    header.numEntities += static_cast<qex_uint32>(entity_count(record));
    append(records, bytes_of(record));
    for (auto const *const own : {&session.to, &session.received_by, &session.sent_by}) {
      append(entities, std::as_bytes(std::span(*own)));
    }
  }
  auto all = copied(bytes_of(header));
  append(all, records);
  append(all, entities);
  return all;
}

}  // namespace simhost::mirror

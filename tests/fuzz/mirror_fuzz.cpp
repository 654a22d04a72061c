// Mirror session tables: allocated, edited and walked by the module's methods, judged by the host.
//
// Not tried, because nothing checks it: entities that are not in the table, a table whose counts
// say more than there is.

#include "helpers/mirror.h"
#include "model/lookup.h"
#include "model/mirror/properties.h"
#include "model/mirror/sessions.h"
#include "model/properties/properties.h"
#include "tests/fuzz/harness.h"
#include "tests/fuzz/host.h"

namespace {

struct FreeTable {
  void operator()(DVMirrorSessionTable *table) const { free_dvmirror_session_table(table); }
};
using Table = std::unique_ptr<DVMirrorSessionTable, FreeTable>;

char const *position(Table const &table, std::size_t sessions, std::size_t entities) {
  return reinterpret_cast<char const *>(table.get() + 1) + sessions * sizeof(DVMirrorSession) +
         entities * sizeof(DVMirrorEntity);
}

void set_session(Input &input, Table const &table) {
  auto const count = static_cast<int>(table->numSessions);
  auto const index = consume_index(input, count);
  auto *const found = mirror_session_at(table.get(), index);
  bool const is_there = 0 <= index && index < count;
  require((found != nullptr) == is_there, "an index below the count, and no other, has a session");
  auto const session = consume_record<DVMirrorSession>(input);
  mirror_set_session_at(table.get(), index, &session);
  if (is_there) {
    require(reinterpret_cast<char *>(found) == position(table, static_cast<std::size_t>(index), 0),
            "sessions lie after the header");
    require(std::memcmp(found, &session, sizeof session) == 0, "a session is stored whole");
    mirror_set_session_at(table.get(), 0, found);
  }
}

std::string text_of(DVMirrorEntity const *entity) {
  auto const text = mirror_entity_text(entity);
  require(strnlen(text.text, sizeof text.text) < sizeof text.text, "the text of an entity ends");
  return text.text;
}

/// Any bytes as an entity, whose text is read, replaced, and put back.
void set_entity(Input &input, Table const &table) {
  if (table->numEntities == 0) {
    return;
  }
  auto const index = input.ConsumeIntegralInRange<qex_uint32>(0, table->numEntities - 1);
  auto *const entity = mirror_entity_at(table.get(), static_cast<int>(index));
  require(reinterpret_cast<char *>(entity) == position(table, table->numSessions, index),
          "entities lie after the sessions");
  auto const bytes = consume_record<DVMirrorEntity>(input);
  std::memcpy(entity, &bytes, sizeof bytes);
  if (input.ConsumeBool()) {
    int const type = input.ConsumeIntegralInRange<int>(-1, MIRROR_ENTTYPE_PORT + 1);
    std::memcpy(entity, &type, sizeof type);
  }
  text_of(entity);
  mirror_set_entity_text(entity, consume_text(input, 60).c_str());
  auto const text = text_of(entity);
  mirror_set_entity_text(entity, text.c_str());
  require(text_of(entity) == text, "the text of an entity can be put back");
  if (index + 1 < table->numEntities) {
    require(
        mirror_next_entity(entity) == mirror_entity_at(table.get(), static_cast<int>(index) + 1),
        "the next entity is the next one of the table");
  }
}

/// Gives each session entities of the table, or any others.
void spread_entities(Input &input, Table const &table) {
  for (qex_uint32 index = 0; index < table->numSessions; ++index) {
    auto *const session = mirror_session_at(table.get(), static_cast<int>(index));
    session->startIdx = input.ConsumeIntegralInRange<qex_uint32>(0, table->numEntities);
    session->numDstEntities = input.ConsumeIntegralInRange<qex_uint32>(0, 3);
    session->numSrcInEntities = input.ConsumeIntegralInRange<qex_uint32>(0, 3);
    session->numSrcOutEntities = input.ConsumeBool() ? 0 : input.ConsumeIntegral<qex_uint32>();
  }
}

simhost::BytesView bytes_of(Table const &table) {
  auto const *const end = position(table, table->numSessions, table->numEntities);
  auto const *const start = reinterpret_cast<std::byte const *>(table.get());
  return {start, reinterpret_cast<std::byte const *>(end)};
}

/// The host takes a table or refuses it; the sessions of one that it took are there, twice over.
void offer(Table const &table) {
  simhost::storage::ChangingTransaction transaction(shared_host());
  auto const key = simhost::get_switch(transaction, "s").key;
  auto const port = simhost::get_port(transaction, key, "p1");
  auto const taken = is_accepted([&] {
    simhost::mirror::append_sessions(transaction, port, simhost::mirror::table_bytes(*table));
  });
  require(!taken || table->numSessions == 0 || !is_accepted([&] {
    simhost::mirror::append_sessions(transaction, port, bytes_of(table));
  }),
          "a session is not added twice");
  auto const kept = Block::of(
      simhost::effective_bytes(transaction, simhost::mirror::sessions, simhost::owner_of(port)));
  require(!taken || kept.as<DVMirrorSessionTable>()->numSessions == table->numSessions,
          "the host keeps the sessions that it takes");
  for (qex_uint32 index = 0; taken && index < table->numSessions; ++index) {
    simhost::mirror::remove_session(transaction, port,
                                    mirror_session_at(table.get(), static_cast<int>(index))->sid);
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  auto const sessions = input.ConsumeIntegralInRange<int>(0, 4);
  auto const entities = input.ConsumeIntegralInRange<int>(0, 6);
  Table const table(alloc_dvmirror_session_table(sessions, entities));
  table->version = static_cast<DVMirrorVersion>(input.ConsumeIntegralInRange(1, 3));
  while (input.remaining_bytes() > 0) {
    switch (input.ConsumeIntegralInRange(0, 2)) {
      case 0:
        set_session(input, table);
        break;
      case 1:
        set_entity(input, table);
        break;
      default:
        spread_entities(input, table);
        break;
    }
  }
  offer(table);
  return 0;
}

// Images of the state and of a port: read back whole or refused, whatever their bytes are, and read
// back the same when the host wrote them.

#include <span>
#include <string>
#include <vector>

#include "abi/data_lists.h"
#include "base/blocks.h"
#include "model/lookup.h"
#include "model/properties/registry.h"
#include "model/state/images.h"
#include "tests/fuzz/host.h"
#include "tests/fuzz/properties.h"

namespace {

using simhost::BlockKind;
using simhost::Bytes;
using simhost::BytesView;
using simhost::Extent;
using simhost::Writer;
using simhost::storage::ChangingTransaction;

/// What the header of a block says after its magic number, format, kind and version.
constexpr std::size_t kLength = 16;
constexpr std::size_t kChecksum = 20;
constexpr std::size_t kHeader = 24;

template <typename Number>
void put(Bytes &block, std::size_t offset, Number number) {
  std::memcpy(block.data() + offset, &number, sizeof number);
}

/// Makes length and checksum right, so that what follows them is looked at.
Bytes sealed(Bytes block) {
  std::uint32_t sum = 2166136261U;
  for (auto at = block.begin() + kHeader; at != block.end(); ++at) {
    sum = (sum ^ std::to_integer<std::uint32_t>(*at)) * 16777619U;
  }
  put(block, kLength, static_cast<std::uint32_t>(block.size() - kHeader));
  put(block, kChecksum, sum);
  return block;
}

void write_properties(Input &input, Writer &writer) {
  auto const count = input.ConsumeIntegralInRange<std::uint32_t>(0, 3);
  writer.number(count);
  for (std::uint32_t index = 0; index < count; ++index) {
    writer.text(consume_key(input));
    writer.number(input.ConsumeIntegralInRange<std::uint32_t>(0, 9));
    writer.bytes(consume_value(input));
  }
}

std::string consume_name(Input &input, std::string const &usual) {
  return input.ConsumeBool() ? usual + std::to_string(input.ConsumeIntegralInRange(0, 2))
                             : input.ConsumeRandomLengthString(70);
}

void write_port(Input &input, Writer &writer) {
  writer.text(consume_name(input, "p"));
  writer.number(input.ConsumeIntegralInRange<std::uint32_t>(0, 2));
  writer.text(consume_name(input, "external"));
  writer.text(consume_name(input, "nic"));
  write_properties(input, writer);
}

void write_switch(Input &input, Writer &writer) {
  writer.text(consume_name(input, "s"));
  writer.text(consume_name(input, "id"));
  writer.text(consume_name(input, "portset"));
  writer.number(input.ConsumeBool() ? 8 : input.ConsumeIntegral<std::uint32_t>());
  writer.number(input.ConsumeBool() ? 200 : input.ConsumeIntegral<std::uint32_t>());
  writer.number(input.ConsumeIntegralInRange<std::uint32_t>(0, 2));
  writer.number(input.ConsumeIntegralInRange<std::uint32_t>(0, 2));
  write_properties(input, writer);
  write_properties(input, writer);
  auto const ports = input.ConsumeIntegralInRange<std::uint32_t>(0, 3);
  writer.number(ports);
  for (std::uint32_t index = 0; index < ports; ++index) {
    write_port(input, writer);
  }
}

/// An image of the right form with any content.
Bytes written_image(Input &input) {
  Writer writer;
  auto const switches = input.ConsumeIntegralInRange<std::uint32_t>(0, 2);
  writer.number(switches);
  for (std::uint32_t index = 0; index < switches; ++index) {
    write_switch(input, writer);
  }
  return writer.block(input.ConsumeBool() ? BlockKind::state : BlockKind::persistent_state, 0);
}

Bytes port_state(Input &input) {
  Writer writer;
  write_properties(input, writer);
  return writer.block(BlockKind::port_state, 200);
}

/// Cuts an image, or changes some of its bytes.
Bytes damaged(Input &input, Bytes image) {
  image.resize(input.ConsumeIntegralInRange(kHeader, image.size()));
  for (auto left = input.ConsumeIntegralInRange(0, 4); left > 0; --left) {
    auto const at = input.ConsumeIntegralInRange<std::size_t>(0, image.size() - 1);
    image[at] = std::byte{input.ConsumeIntegral<std::uint8_t>()};
  }
  return input.ConsumeBool() ? sealed(std::move(image)) : image;
}

Bytes any_bytes(Input &input) {
  auto const bytes = input.ConsumeRemainingBytes<std::uint8_t>();
  auto const view = std::as_bytes(std::span(bytes));
  return {view.begin(), view.end()};
}

bool loads(ChangingTransaction &transaction, Block const &image) {
  BytesView const view(image.as<std::byte>(), image.size());
  return is_accepted([&] { simhost::load_state(transaction, view, Extent::whole); });
}

/// What the host accepts it can describe, and write so that it reads the same again.
void load(Bytes const &image) {
  ChangingTransaction transaction(shared_host());
  if (!loads(transaction, Block::of(image))) {
    return;
  }
  simhost::scenario::description(transaction);
  auto const once = simhost::state_image(transaction, Extent::whole);
  require(loads(transaction, Block::of(once)), "the host reads its own image");
  require(simhost::state_image(transaction, Extent::whole) == once,
          "an image is read as it was written");
}

void load_into_port(Bytes const &image) {
  ChangingTransaction transaction(shared_host());
  auto const port = simhost::get_port(transaction, simhost::get_switch(transaction, "s").key, "p1");
  auto const block = Block::of(image);
  BytesView const view(block.as<std::byte>(), block.size());
  if (is_accepted([&] { simhost::load_port(transaction, port, view); })) {
    auto const once = simhost::port_image(transaction, port, Extent::whole, 200);
    require(is_accepted([&] { simhost::load_port(transaction, port, once); }),
            "the host reads its own image of a port");
  }
}

/// Lists are only written; what was put in must be there to be read.
void write_list(Input &input) {
  auto list = simhost::make_list_of_host();
  std::vector<std::pair<std::string, Bytes>> items;
  while (input.remaining_bytes() > 0) {
    auto const name = consume_key(input);
    auto const value = consume_value(input);
    simhost::add_item(*list, name, value, simhost::storage::PropertyType::runtime);
    std::erase_if(items, [&](auto const &item) { return item.first == name; });
    items.emplace_back(name, value);
  }
  auto const block = list->serialized(200);
  list.reset();
  simhost::Reader reader(block);
  require(reader.number() == items.size(), "a list has the items that it was given");
  for (std::size_t index = 0; index < items.size(); ++index) {
    auto const name = reader.text();
    reader.number();
    auto const value = reader.bytes();
    auto const found = std::find_if(items.begin(), items.end(),
                                    [&](auto const &item) { return item.first == name; });
    require(found != items.end() &&
                std::equal(value.begin(), value.end(), found->second.begin(), found->second.end()),
            "an item is what it was last given");
  }
  reader.end();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const *data, std::size_t size) {
  Input input(data, size);
  switch (input.ConsumeIntegralInRange(0, 4)) {
    case 0:
      load(written_image(input));
      break;
    case 1:
      load(damaged(input, written_image(input)));
      break;
    case 2:
      load(any_bytes(input));
      break;
    case 3:
      load_into_port(port_state(input));
      break;
    default:
      write_list(input);
      break;
  }
  return 0;
}

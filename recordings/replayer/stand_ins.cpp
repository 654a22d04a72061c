#include "recordings/replayer/stand_ins.h"

#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "recordings/core/line.h"
#include "recordings/core/values.h"

namespace recordings {
namespace {

Visitor the_visitor = nullptr;

/// Tells of a callback: its values are in a line that ends with those.
int tell(Line &line) {
  line.raw("}}");
  // Python may make a call meanwhile, which calls back itself.
  std::string const told(line.text());
  return the_visitor == nullptr || !line.is_whole() ? 1 : the_visitor(told.c_str());
}

Line &begin(Line &line, std::string_view argument) {
  line.raw("{").member("argument").text(argument);
  return line.member("in").raw("{");
}

void member(Line &line, std::string_view name, void const *address) {
  write_pointer(line.member(name), reinterpret_cast<std::uint64_t>(address));
}

}  // namespace

Visiting::Visiting(Visitor visitor) noexcept : before_(the_visitor) {
  the_visitor = visitor;
}

Visiting::~Visiting() {
  the_visitor = before_;
}

char visit(void *reached, void *context) {
  Line line;
  member(begin(line, "callback"), "reached", reached);
  member(line, "context", context);
  return static_cast<char>(tell(line));
}

void *allocate(std::size_t size) {
  void *const memory = std::malloc(size);
  Line line;
  begin(line, "alloc").member("size").number(static_cast<std::uint64_t>(size));
  member(line, "result", memory);
  tell(line);
  return memory;
}

void release(void *memory) {
  Line line;
  member(begin(line, "release"), "memory", memory);
  tell(line);
  std::free(memory);
}

}  // namespace recordings

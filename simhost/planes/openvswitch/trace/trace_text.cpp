// Visits and actions are told by how far they are indented.
#include "planes/openvswitch/trace/trace_text.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <map>
#include <optional>
#include <utility>

namespace simhost::openvswitch {
namespace {

constexpr std::size_t kIndent = 4;
constexpr std::string_view kSpace = " ";

template <typename Number>
std::optional<Number> number_in(std::string_view text, int base) {
  Number number{};
  auto const read = std::from_chars(text.data(), text.data() + text.size(), number, base);
  return read.ec == std::errc{} ? std::optional(number) : std::nullopt;
}

// " 5. reg1=0x1/0x1, priority 1000, cookie 0x400000000000000", without its indent.
std::optional<TraceLine> visit_in(std::string_view line) {
  auto const dot = line.find(". ");
  auto const table = number_in<std::uint8_t>(line, 10);
  if (dot == std::string_view::npos || !table ||
      line.substr(0, dot).find_first_not_of("0123456789") != std::string_view::npos) {
    return std::nullopt;
  }
  TraceLine visit{.kind = TraceLine::Kind::visit, .table = *table};
  visit.missed = line.substr(dot + 2).starts_with("No match");
  constexpr std::string_view kCookie = "cookie 0x";
  if (auto const at = line.rfind(kCookie); at != std::string_view::npos) {
    visit.cookie = number_in<std::uint64_t>(line.substr(at + kCookie.size()), 16).value_or(0);
  }
  return visit;
}

// An action is of the last visit whose actions are indented as it is.
class Owners {
 public:
  void visited(TraceLine const &visit) { last_ = visit; }
  TraceLine owner_of(std::size_t indent) {
    if (last_) {
      by_indent_.erase(by_indent_.upper_bound(indent), by_indent_.end());
      by_indent_[indent] = *std::exchange(last_, std::nullopt);
    }
    auto const after = by_indent_.upper_bound(indent);
    return after == by_indent_.begin() ? TraceLine{} : std::prev(after)->second;
  }

 private:
  std::optional<TraceLine> last_;
  std::map<std::size_t, TraceLine> by_indent_;
};

TraceLine line_of(TraceLine const &owner, std::size_t indent, std::string_view text) {
  bool const is_remark = text.starts_with("->") || text.starts_with(">>");
  return {.kind = is_remark ? TraceLine::Kind::remark : TraceLine::Kind::action,
          .depth = indent / kIndent,
          .table = owner.table,
          .cookie = owner.cookie,
          .text = std::string(text)};
}

}  // namespace

std::vector<TraceLine> read_trace(std::string_view text) {
  std::vector<TraceLine> lines;
  Owners owners;
  while (!text.empty()) {
    auto const end = std::min(text.find('\n'), text.size());
    auto const line = text.substr(0, end);
    text.remove_prefix(std::min(end + 1, text.size()));
    auto const indent = line.find_first_not_of(kSpace);
    if (indent == std::string_view::npos) {
      continue;
    }
    auto const said = line.substr(indent);
    if (auto visit = visit_in(said)) {
      visit->depth = indent / kIndent;
      owners.visited(*visit);
      lines.push_back(*std::move(visit));
    } else if (indent >= kIndent) {
      lines.push_back(line_of(owners.owner_of(indent - indent % kIndent), indent, said));
    }
  }
  return lines;
}

}  // namespace simhost::openvswitch

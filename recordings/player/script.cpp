#include "recordings/player/script.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <sstream>

namespace recordings {
namespace {

constexpr std::int64_t newest_version = 1;
// Records lie in records, some levels deep; whatever follows a value by calling itself may do so.
constexpr int deepest = 64;

[[noreturn]] void refuse(std::size_t line, std::string const &what) {
  throw Unplayable("line " + std::to_string(line) + ": " + what);
}

bool is_too_deep(std::string_view json) {
  int depth = 0;
  bool is_text = false;
  for (std::size_t at = 0; at < json.size(); ++at) {
    char const one = json[at];
    if (is_text) {
      at += one == '\\' ? 1 : 0;
      is_text = one != '"';
    } else if (one == '"') {
      is_text = true;
    } else if (one == '{' || one == '[') {
      if (++depth > deepest) {
        return true;
      }
    } else if (one == '}' || one == ']') {
      --depth;
    }
  }
  return false;
}

/// Members of one line that must be there.
class Fields {
 public:
  Fields(Json const &event, std::size_t line) : event_(event), line_(line) {}

  [[nodiscard]] Json const &member(char const *name) const {
    auto const found = event_.find(name);
    if (found == event_.end()) {
      refuse(line_, "the event lacks '" + std::string(name) + "'");
    }
    return *found;
  }

  [[nodiscard]] std::int64_t whole(char const *name) const {
    Json const &found = member(name);
    if (!found.is_number_integer()) {
      refuse(line_, std::string(name) + " is no whole number");
    }
    return found.get<std::int64_t>();
  }

  [[nodiscard]] std::string const &text(char const *name) const {
    Json const &found = member(name);
    if (!found.is_string()) {
      refuse(line_, std::string(name) + " is no text");
    }
    return found.get_ref<std::string const &>();
  }

  void object(char const *name) const {
    if (!member(name).is_object()) {
      refuse(line_, std::string(name) + " is no object");
    }
  }

  [[nodiscard]] bool has(char const *name) const { return event_.contains(name); }

 private:
  Json const &event_;
  std::size_t line_;
};

Call const *call_named(std::string_view name) {
  auto const found = std::ranges::find(calls, name, &Call::name);
  return found == calls.end() ? nullptr : &*found;
}

}  // namespace

/// Reads line by line.
class ScriptReader {
 public:
  explicit ScriptReader(Script &script) : script_(script) {}

  void read() {
    std::string_view rest = script_.text_;
    while (!rest.empty()) {
      ++line_;
      auto const length = rest.find('\n');
      if (length == std::string_view::npos) {
        refuse(line_, line_ == 1 ? "this is no trace: one begins with what made it"
                                 : "the trace is cut off in the middle of a line");
      }
      read_line(rest.substr(0, length));
      rest.remove_prefix(length + 1);
    }
    if (line_ == 0) {
      refuse(1, "this is no trace: one begins with what made it");
    }
  }

 private:
  using Key = std::pair<std::int64_t, std::int64_t>;  // of an event: its process, and its number

  void read_line(std::string_view held) {
    if (is_too_deep(held)) {
      refuse(line_, "values are nested too deep");
    }
    auto const event = Json::parse(held, nullptr, false);
    if (line_ == 1) {
      header(event);
      return;
    }
    if (!event.is_object()) {
      refuse(line_, event.is_discarded() ? "no JSON" : "no event: a line is an object");
    }
    Fields const fields(event, line_);
    if (fields.has("end")) {
      end(fields, held);
    } else if (fields.has("call") || fields.has("callback")) {
      begin(fields, held);
    } else if (fields.has("parent")) {
      begin_process(fields.whole("process"));
    } else {
      refuse(line_, "no event that a trace has");
    }
  }

  void header(Json const &header) const {
    auto const version = header.is_object() ? header.value("vswitch trace", Json()) : Json();
    if (!version.is_number_integer()) {
      refuse(line_, "this is no trace: one begins with what made it");
    }
    if (version.get<std::int64_t>() != newest_version) {
      refuse(line_, "a trace of version " + version.dump() +
                        ", and this program reads those up to " + std::to_string(newest_version));
    }
  }

  void begin_process(std::int64_t process) {
    std::erase_if(open_, [process](auto const &one) { return one.first.first == process; });
    parts_[process] = script_.parts_.size();
    script_.parts_.push_back({process, {}});
  }

  void begin(Fields const &fields, std::string_view held) {
    bool const is_call = fields.has("call");
    auto const process = fields.whole("process");
    auto const part = parts_.find(process);
    if (part == parts_.end()) {
      refuse(line_, "an event of the process " + std::to_string(process) + ", which did not begin");
    }
    fields.object("in");
    Event event{.line = line_,
                .part = part->second,
                .thread = static_cast<std::uint64_t>(fields.whole("thread")),
                .call = is_call ? call_named(fields.text("function")) : nullptr,
                .outer = outer(fields, process, is_call),
                .inner = {},
                .number = script_.calls_,
                .begin = held,
                .end = {}};
    auto const index = script_.events_.size();
    if (is_call) {
      if (event.call == nullptr) {
        refuse(line_, "no call of the host is named " + fields.text("function"));
      }
      script_.parts_[event.part].threads[event.thread].push_back(index);
      ++script_.calls_;
    } else if (!event.outer) {
      refuse(line_, "the host called back outside a call, which cannot be played");
    }
    if (event.outer) {
      script_.events_[*event.outer].inner.push_back(index);
    }
    Key const key{process, fields.whole(is_call ? "call" : "callback")};
    if (!open_.emplace(key, index).second) {
      refuse(line_, "the number " + std::to_string(key.second) + " begins a second time");
    }
    script_.events_.push_back(std::move(event));
  }

  [[nodiscard]] std::optional<std::size_t> outer(Fields const &fields, std::int64_t process,
                                                 bool is_call) const {
    if (!fields.has("within")) {
      return std::nullopt;
    }
    auto const number = fields.whole("within");
    auto const found = open_.find({process, number});
    if (found == open_.end() || (script_.events_[found->second].call != nullptr) == is_call) {
      refuse(line_, "nothing is in progress that could have the number " + std::to_string(number));
    }
    return found->second;
  }

  void end(Fields const &fields, std::string_view held) {
    Key const key{fields.whole("process"), fields.whole("end")};
    auto const begun = open_.find(key);
    if (begun == open_.end()) {
      refuse(line_, "the end of " + std::to_string(key.second) + ", which did not begin");
    }
    script_.events_[begun->second].end = held;
    open_.erase(begun);
  }

  Script &script_;
  std::size_t line_ = 0;
  std::map<std::int64_t, std::size_t> parts_;
  std::map<Key, std::size_t> open_;
};

Script::Script(std::string text) : text_(std::move(text)) {
  ScriptReader(*this).read();
}

namespace {

void check_call(Call const &call, Json const &in, Json const &end) {
  try {
    decode_inputs(call, in);
  } catch (Unread const &) {  // NOLINT(bugprone-empty-catch): it is told as it was written
  }
  auto const out = end.find("out");
  auto const result = end.value("result", Json());
  try {
    if (out != end.end()) {
      decode_outputs(call, in, *out, result);
    }
    if (end.contains("result")) {
      decode_result(call, result);
    }
  } catch (Unread const &) {  // NOLINT(bugprone-empty-catch): whoever makes the call is told
  }
}

}  // namespace

void Script::check_values() const {
  for (Event const &event : events_) {
    if (event.call != nullptr) {
      auto const begin = Json::parse(event.begin);
      auto const end = event.end.empty() ? Json::object() : Json::parse(event.end);
      try {
        check_call(*event.call, begin["in"], end);
      } catch (Misfit const &misfit) {
        refuse(event.line, misfit.what());
      }
    }
  }
}

std::string text_of_file(std::string const &path) {
  std::ifstream file(path, std::ios::binary);
  std::ostringstream held;
  if (!file || !(held << file.rdbuf())) {
    throw Unplayable(std::strerror(errno));
  }
  return std::move(held).str();
}

}  // namespace recordings

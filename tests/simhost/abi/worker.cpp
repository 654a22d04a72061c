// A process on a state file: does what its arguments say, one after the other, and writes a line
// for each. Any status but QEX_OK ends it.
//   create NAME        creates a switch
//   set NAME MTU       sets its MTU
//   get NAME           writes its MTU
//   create-many P N    creates P-0 to P-(N-1)
//   orphan             ends; a child goes on with the rest once this process is gone
//   vanish             ends at once, without closing anything
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "vswitch/configuration.h"

namespace {

void done(QEX_ReturnStatus status, std::string const &line) {
  if (status != QEX_OK) {
    std::printf("%s: status 0x%08x\n", line.c_str(), static_cast<unsigned>(status));
    std::exit(1);
  }
  std::printf("%s\n", line.c_str());
  std::fflush(stdout);
}

QEX_ReturnStatus create(std::string const &name) {
  return VSDVS_CreateVSwitch(name.c_str(), nullptr, nullptr, 0, 1, 0, 0, 0);
}

void go_on_as_orphan() {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) {
    std::exit(2);
  }
  if (fork() != 0) {
    std::exit(0);
  }
  // The other end closes with the last of the parent.
  close(ends[1]);
  char nothing = 0;
  if (read(ends[0], &nothing, 1) != 0) {
    std::exit(2);
  }
}

}  // namespace

int main(int count, char **values) {
  std::vector<std::string> const words(values + 1, values + count);
  for (std::size_t at = 0; at < words.size();) {
    auto const word = [&] { return words.at(at++); };
    auto const command = word();
    if (command == "orphan") {
      go_on_as_orphan();
      continue;
    }
    if (command == "vanish") {
      _exit(0);
    }
    auto const name = word();
    if (command == "create") {
      done(create(name), name);
    } else if (command == "set") {
      done(VSDVS_SetMTU(name.c_str(), static_cast<qex_uint32>(std::stoul(word()))), name);
    } else if (command == "get") {
      qex_uint32 mtu = 0;
      auto const status = VSDVS_GetMTU(name.c_str(), &mtu);
      done(status, std::to_string(mtu));
    } else if (command == "create-many") {
      auto const many = std::stoul(word());
      for (unsigned long number = 0; number < many; ++number) {
        auto const numbered = name + "-" + std::to_string(number);
        done(create(numbered), numbered);
      }
    } else {
      return 2;
    }
  }
}

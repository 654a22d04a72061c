// A private Open vSwitch for a test program: its data path and its devices are dummies, so that it
// needs no privileges.
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "events/process.h"
#include "soon.h"
#include "temporary_folder.h"

namespace simhost::openvswitch {

class Lab {
 public:
  /// The one of this program.
  static Lab &shared();

  /// What one of Debian's own commands prints.
  std::string ovs_vsctl(std::vector<std::string> arguments);
  std::string ovs_ofctl(std::vector<std::string> arguments);
  std::string ovs_appctl(std::vector<std::string> arguments);
  /// The lines of flows or groups that ovs-ofctl dumps, sorted, without what is about the dump.
  std::vector<std::string> dumped(std::string const &what, std::string const &bridge);

  [[nodiscard]] std::filesystem::path database_socket() const { return folder_.file("db.sock"); }
  [[nodiscard]] std::filesystem::path bridge_socket(std::string const &bridge) const {
    return folder_.file((bridge + ".mgmt").c_str());
  }

 private:
  Lab();

  [[nodiscard]] std::unique_ptr<events::Process> start(std::string const &program,
                                                       std::vector<std::string> words);
  std::string output_of(std::string const &program, std::vector<std::string> words);

  TemporaryFolder folder_;
  events::Loop loop_;
  std::unique_ptr<events::Process> database_;
  std::unique_ptr<events::Process> switch_;
};

/// A bridge with ports <name>p1, <name>p2 and so on, that have those numbers.
class Bridge {
 public:
  explicit Bridge(unsigned ports = 0);
  Bridge(Bridge const &) = delete;
  Bridge &operator=(Bridge const &) = delete;
  ~Bridge();

  [[nodiscard]] std::string const &name() const { return name_; }
  [[nodiscard]] std::filesystem::path socket() const;
  [[nodiscard]] std::vector<std::string> flows() const;
  [[nodiscard]] std::vector<std::string> groups() const;

 private:
  std::string name_;
};

}  // namespace simhost::openvswitch

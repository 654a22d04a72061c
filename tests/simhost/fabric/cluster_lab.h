// A cluster of ovsdb-servers for a test, on this machine.
#pragma once

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "events/process.h"
#include "fabric/cluster/servers.h"
#include "temporary_folder.h"

namespace simhost::fabric {

class ClusterLab {
 public:
  /// Of so many servers, all of which are connected to it.
  ClusterLab(std::filesystem::path const &schema, std::size_t servers);

  [[nodiscard]] Servers servers() const;
  /// What Debian's own client prints.
  std::string transact(std::size_t server, std::string const &transaction);
  void start(std::size_t server);
  /// At once.
  void kill(std::size_t server);
  /// Returns when it has the majority of the cluster with it.
  void wait_for(std::size_t server);

 private:
  [[nodiscard]] std::string host(std::size_t server) const;
  [[nodiscard]] std::string remote(std::size_t server) const;
  [[nodiscard]] std::string peer(std::size_t server) const;
  [[nodiscard]] std::string file(std::size_t server, char const *suffix) const;

  TemporaryFolder folder_;
  events::Loop loop_;
  unsigned network_;
  std::vector<std::unique_ptr<events::Process>> servers_;
};

}  // namespace simhost::fabric

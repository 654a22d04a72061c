// A host as a member of its fabric: what is shared is followed into its state, and what is changed
// of it here is decided there.
#pragma once

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "daemon/server.h"
#include "daemon/troubles.h"
#include "events/loop.h"
#include "fabric/agent/claim.h"
#include "fabric/agent/decision.h"
#include "fabric/cluster/cluster.h"
#include "fabric/rows/port_rows.h"
#include "fabric/rows/rows.h"
#include "fabric/rows/touched.h"
#include "fabric/shared/records.h"
#include "storage/store.h"

namespace simhost::fabric {

using daemon::Reply;
using daemon::Say;

struct Options {
  std::filesystem::path state;
  Servers servers;
  std::string host;  ///< its name in the fabric
};

/// What moves the frames says of itself.
struct InForce {
  std::uint64_t change = 0;  ///< of the state
  std::string troubles;
};

class Member {
 public:
  /// Of a state that has a daemon. Throws std::runtime_error for one that belongs to the fabric by
  /// another name.
  Member(events::Loop &loop, Options options, Say say);

  void tell(InForce const &in_force);

 private:
  struct Joining {
    Reply reply;
    bool is_new;  // the fabric did not have this host at the switch before
  };

  void connect();
  void begin_anew();
  void lose(std::string const &why);
  void watch();
  void receive();
  void ask_server_later();
  void settle_undecided();

  void sync_soon(events::Clock::duration wait = {});
  void sync();
  bool take_news();
  bool follow_touched();
  void tell_of_state(std::string const &why);
  void tell_joined();
  Json unjoined(Joining const &joining, std::pair<SharedName const, std::string> const &why);
  void let_go();
  void reply_to_drills();

  void report_soon();
  void report();
  void tell_counts_later();
  bool report_counts();
  bool tell_counts(Json const &operations, std::string &why);
  [[nodiscard]] std::map<std::string, std::string> links();

  [[nodiscard]] daemon::Questions questions();
  [[nodiscard]] Proposal proposed(std::string const &id, Json const &operations) const;
  Json operations_for(std::vector<Change> const &changes);
  Decision decided(Proposal const &proposal, std::chrono::milliseconds longest);
  void commit(Json const &question, Reply const &reply);
  void join(std::string const &alias, Reply const &reply);
  [[nodiscard]] Json status() const;

  events::Loop &loop_;
  Options options_;
  Say say_;
  storage::Store store_;
  Membership membership_;
  Claim claim_;
  Cluster cluster_;
  daemon::Server server_;
  std::string trouble_;
  std::optional<events::Clock::time_point> lost_;
  std::vector<Proposal> undecided_;
  Touched touched_;
  PortRows port_rows_;
  std::map<SharedName, std::string> unborne_;
  bool is_left_ = false;                         // of what follow() found
  std::multimap<std::string, Joining> joining_;  // by the alias of the switch
  Writers writers_;                              // as they were seen last
  std::int64_t revision_ = 0;                    // that is in the state
  std::uint64_t change_ = 0;                     // of the state, with which it came
  InForce in_force_;
  Json reported_;
  bool counts_are_due_ = false;
  std::string why_counts_are_untold_;
  std::string trouble_of_state_;
  std::vector<events::Loop::Watch> watches_;
  events::Loop::Timer next_connect_;
  events::Clock::duration pause_{};  // before it
  events::Loop::Timer next_question_;
  events::Loop::Timer next_sync_;
  events::Clock::duration next_wait_{};
  events::Clock::duration state_pause_{};  // while the state takes nothing
  events::Loop::Timer next_report_;
  events::Loop::Timer next_counts_;
};

}  // namespace simhost::fabric

// A change leaves a row with its id, of which there can be but one: so a transaction can be sent
// again after its server was lost, and a row that revokes it decides for good that it is not made.
#include "fabric/agent/decision.h"

#include <algorithm>
#include <array>
#include <string_view>
#include <thread>

#include "fabric/rows/operations.h"

namespace simhost::fabric {
namespace {

using namespace std::chrono_literals;

// After so long another server is tried.
constexpr auto kPatienceWithServer = 4s;
constexpr auto kPause = 50ms;
// An election takes less; without a majority nobody shall wait for long.
constexpr auto kReachedBy = 3s;

// By these words the database says that it will not; all others may be those of a server in need.
bool is_final(ovsdb::TransactionRefused const &refusal) {
  constexpr std::array<std::string_view, 5> kFinal{"refuses to wait", "constraint violation",
                                                   "referential integrity violation",
                                                   "permission error", "range error"};
  std::string_view const words(refusal.what());
  return std::ranges::any_of(kFinal,
                             [&](auto one) { return words.find(one) != std::string_view::npos; });
}

Deadline next_deadline(Deadline deadline) {
  return std::min<Deadline>(deadline, Deadline::clock::now() + kPatienceWithServer);
}

bool is_made(Json const &selected) {
  auto const &rows = selected.at(0).at("rows");
  return !rows.empty() && !rows.at(0).at("revoked").get<bool>();
}

class Deciding {
 public:
  Deciding(Cluster &cluster, Proposal const &proposal, Deadline deadline)
      : cluster_(cluster), proposal_(proposal), deadline_(deadline) {}

  Decision run() {
    while (true) {
      try {
        if (!cluster_.is_connected()) {
          cluster_.connect();
        }
        return attempt();
      } catch (Unreachable const &unreachable) {
        why_ = unreachable.what();
      }
      if (Deadline::clock::now() >= (in_doubt_ ? deadline_ : reached_by_)) {
        return {in_doubt_ ? Verdict::unknown : Verdict::refused, why_};
      }
      std::this_thread::sleep_for(kPause);
    }
  }

 private:
  Decision attempt() {
    // An attempt whose server was lost may have been made.
    if (in_doubt_ && is_there()) {
      return {Verdict::made, {}};
    }
    bool const was_in_doubt = in_doubt_;
    in_doubt_ = true;
    try {
      cluster_.transact(proposal_.operations, next_deadline(deadline_));
      return {Verdict::made, {}};
    } catch (ovsdb::TransactionRefused const &refusal) {
      if (!is_final(refusal)) {
        cluster_.disconnect();
        throw Unreachable(refusal.what());
      }
      // A server may try a second time by itself, and refuse then what it has made.
      bool const made =
          was_in_doubt ? was_made(cluster_, proposal_, next_deadline(deadline_)) : is_there();
      return made ? Decision{Verdict::made, {}} : Decision{Verdict::refused, refusal.what()};
    }
  }

  bool is_there() {
    return is_made(cluster_.transact(change_selection(proposal_.id), next_deadline(deadline_)));
  }

  Cluster &cluster_;
  Proposal const &proposal_;
  Deadline deadline_;
  Deadline reached_by_ = Deadline::clock::now() + kReachedBy;
  bool in_doubt_ = false;
  std::string why_;
};

}  // namespace

Decision decide(Cluster &cluster, Proposal const &proposal, Deadline deadline) {
  return Deciding(cluster, proposal, deadline).run();
}

bool was_made(Cluster &cluster, Proposal const &proposal, Deadline deadline) {
  try {
    cluster.transact(change_insertion(proposal.id, proposal.host, true), deadline);
    return false;
  } catch (ovsdb::TransactionRefused const &refusal) {
    if (!is_final(refusal)) {
      cluster.disconnect();
      throw Unreachable(refusal.what());
    }
  }
  return is_made(cluster.transact(change_selection(proposal.id), deadline));
}

}  // namespace simhost::fabric

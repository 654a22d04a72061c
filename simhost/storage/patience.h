// How long a call waits for other processes on one state.
#pragma once

#include <algorithm>
#include <chrono>

namespace simhost::storage {

inline constexpr std::chrono::seconds kPatience{10};

/// What is left of the time that a call waits in all, in as many transactions as it takes.
class Patience {
 public:
  explicit Patience(std::chrono::nanoseconds left = kPatience) : left_(left) {}
  [[nodiscard]] std::chrono::nanoseconds left() const { return left_; }

  /// Runs `work`, which waits no longer than the time it is given; what it takes is gone.
  template <typename Work>
  void spend(Work const &work) {
    Spent const spent(*this);
    work(left_);
  }

 private:
  using Clock = std::chrono::steady_clock;

  // Also when the work throws, as it does when it has waited in vain.
  class Spent {
   public:
    explicit Spent(Patience &patience) : patience_(patience) {}
    ~Spent() {
      patience_.left_ =
          std::max(patience_.left_ - (Clock::now() - begin_), std::chrono::nanoseconds::zero());
    }
    Spent(Spent const &) = delete;
    Spent &operator=(Spent const &) = delete;

   private:
    Patience &patience_;
    Clock::time_point begin_ = Clock::now();
  };

  std::chrono::nanoseconds left_;
};

}  // namespace simhost::storage

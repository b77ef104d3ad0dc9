// When something that was started and died may be started again.
#ifndef HOST_WATCH_BACK_OFF_H
#define HOST_WATCH_BACK_OFF_H

#include <algorithm>
#include <chrono>

namespace vornhost {

/// The first start may be at once. Each that follows waits twice as long as the one before, until one has lasted.
class BackOff {
public:
  using Clock = std::chrono::steady_clock;

  static constexpr std::chrono::seconds kFirstPause{1};
  static constexpr std::chrono::seconds kLongestPause{60};
  /// What has run for so long counts as well.
  static constexpr std::chrono::seconds kLasting{120};

  /// @param[in] longest  that a pause becomes
  explicit BackOff(std::chrono::seconds longest = kLongestPause) : longest_(longest) {}

  /// @return the moment from which on it may be started
  Clock::time_point GetNext() const { return next_; }

  /// It is started now, or that is tried.
  void Note(Clock::time_point now) {
    if (now - last_ >= kLasting) {
      pause_ = kFirstPause;
    }
    last_ = now;
    next_ = now + pause_;
    pause_ = std::min(pause_ * 2, longest_);
  }

private:
  std::chrono::seconds longest_;
  Clock::time_point last_{};
  Clock::time_point next_{};
  std::chrono::seconds pause_ = kFirstPause;
};

} // namespace vornhost

#endif

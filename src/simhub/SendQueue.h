#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <vector>

#include "qmi/Qmi.h"

namespace simhub {

/// What the hub has for a client that does not take it as fast as it comes.
class SendQueue {
 public:
  /// How much may wait; more, and the client is given up.
  static constexpr std::size_t kMaxBytes = std::size_t{4} << 20;

  enum class Sent {
    kNow,
    kLater,  ///< the client takes no more for now
    kGone,   ///< the client has gone
  };
  enum class Outcome { kKept, kLost, kOverflow };

  /// Hands the datagram to `send`, which takes Bytes and returns a Sent, or keeps it behind those that wait.
  template <class Send>
  [[nodiscard]] Outcome Add(qmi::Bytes datagram, Send send) {
    if (datagrams_.empty()) {
      const Sent sent = send(datagram);
      if (sent != Sent::kLater) return sent == Sent::kNow ? Outcome::kKept : Outcome::kLost;
    }
    if (bytes_ + datagram.size() > kMaxBytes) return Outcome::kOverflow;
    datagrams_.emplace_back(datagram.begin(), datagram.end());
    bytes_ += datagram.size();
    return Outcome::kKept;
  }

  /// Hands on what waits, as far as the client takes it. False: the client has gone.
  template <class Send>
  [[nodiscard]] bool Flush(Send send) {
    while (!datagrams_.empty()) {
      const Sent sent = send(qmi::Bytes(datagrams_.front()));
      if (sent != Sent::kNow) return sent == Sent::kLater;
      bytes_ -= datagrams_.front().size();
      datagrams_.pop_front();
    }
    return true;
  }

  [[nodiscard]] bool IsEmpty() const { return datagrams_.empty(); }

 private:
  std::deque<std::vector<std::uint8_t>> datagrams_;
  std::size_t bytes_ = 0;
};

}  // namespace simhub

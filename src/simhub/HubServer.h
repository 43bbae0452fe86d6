// Runs a simulated hub in real time or a multiple of it, for clients in other processes. One thread does
// everything, in rounds; how datagrams come and go is up to the server that is derived from it.
#pragma once

#include <chrono>
#include <memory>
#include <span>
#include <string>
#include <vector>

#include <poll.h>

#include "simhub/Diagnostics.h"
#include "simhub/Hub.h"

namespace simhub {

struct HubServerOptions {
  HubFiles files;
  double speed = 1;  ///< hub seconds per real second, > 0
};

class HubServer : public HubOutput {
 public:
  HubServer(const HubServer&) = delete;
  HubServer& operator=(const HubServer&) = delete;

  /// Runs until `stop` can be read. 0 or the errno value that ended it.
  [[nodiscard]] int Run(int stop);
  /// One round: takes what came in, moves the hub's time on, and waits for more, at most so long. 0 or an
  /// errno value. `stop` as in Run, or negative; `*stopped` is set when it can be read.
  [[nodiscard]] int Round(std::chrono::nanoseconds maxWait, int stop, bool* stopped);

 protected:
  using Clock = std::chrono::steady_clock;

  HubServer(double speed, Diagnostics diagnostics);
  /// Starts the hub, and its time. False with the reason in `error`.
  [[nodiscard]] bool startHub(Scenario scenario, const HubFiles& files, std::string* error);
  [[nodiscard]] Hub& hub() { return *hub_; }
  void tell(const std::string& text) const { diagnostics_(text); }

  /// Appends what a round waits for.
  virtual void addPolled(std::vector<pollfd>* polled) = 0;
  /// How long a round may wait for all that.
  [[nodiscard]] virtual std::chrono::nanoseconds patience() const = 0;
  /// Takes in what came, after the hub's time has moved on; `polled` is what addPolled appended.
  virtual void takeIncoming(std::span<const pollfd> polled) = 0;
  /// Takes those clients from the hub that have gone.
  virtual void dropLost() = 0;

 private:
  void advance();
  [[nodiscard]] Time hubTime() const;
  [[nodiscard]] std::chrono::nanoseconds untilNextEvent() const;
  void Diagnostic(const std::string& text) override { diagnostics_(text); }

  const double speed_;
  const Diagnostics diagnostics_;
  std::unique_ptr<Hub> hub_;
  Clock::time_point start_;
};

}  // namespace simhub

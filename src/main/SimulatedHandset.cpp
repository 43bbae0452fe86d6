#include "main/SimulatedHandset.h"

#ifndef VANTLE_HANDSET

#include <charconv>
#include <cstdlib>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "simhub/Hub.h"
#include "simhub/Scenario.h"
#include "simhub/SimulatedRoot.h"
#include "ssc/Log.h"
#include "ssc/Results.h"

namespace {

constexpr std::string_view kSimulated = "sim";

/// What comes out of the hub, until the event thread takes it. Buffers are handed back and used again.
class IncomingQueue {
 public:
  ssc::Incoming& Push(ssc::Incoming::Kind kind) {
    if (end_ == slots_.size()) slots_.emplace_back();
    ssc::Incoming& slot = slots_[end_++];
    slot.kind = kind;
    slot.datagram.clear();
    return slot;
  }
  bool Pop(ssc::Incoming* incoming) {
    if (begin_ == end_) return false;
    std::swap(*incoming, slots_[begin_++]);
    if (begin_ == end_) begin_ = end_ = 0;
    return true;
  }

 private:
  std::vector<ssc::Incoming> slots_;
  std::size_t begin_ = 0;
  std::size_t end_ = 0;
};

/// The simulated hub as the client library wants it: one client, datagrams one by one.
class EmbeddedSimulatedHub final : public ssc::EmbeddedHub, public simhub::HubOutput {
 public:
  [[nodiscard]] bool Start(simhub::Scenario scenario, const std::string& root, std::string* error) {
    hub_ = simhub::Hub::Create(std::move(scenario), simhub::hubFiles(root), *this, error);
    if (hub_ == nullptr) return false;
    client_ = hub_->AddClient();
    return true;
  }

  int Submit(qmi::Bytes datagram) override {
    return hub_->HandleDatagram(client_, datagram) ? ssc::kOk : ssc::kNotConnected;
  }

  bool RunUntil(ssc::Clock::TimePoint limit, ssc::Incoming* incoming) override {
    while (!incoming_.Pop(incoming)) {
      const std::optional<simhub::Time> next = hub_->NextEventTime();
      if (next && *next <= limit.time_since_epoch()) {
        hub_->Step();
        continue;
      }
      if (limit != ssc::Clock::TimePoint::max()) hub_->AdvanceTo(limit.time_since_epoch());
      return false;
    }
    return true;
  }

  ssc::Clock::TimePoint Now() const override { return ssc::Clock::TimePoint{hub_->Now()}; }

  void Deliver(simhub::ClientId, qmi::Bytes datagram) override {
    incoming_.Push(ssc::Incoming::Kind::kDatagram).datagram.assign(datagram.begin(), datagram.end());
  }
  void HubDown() override { incoming_.Push(ssc::Incoming::Kind::kDown); }
  void HubUp() override { incoming_.Push(ssc::Incoming::Kind::kUp); }
  void Diagnostic(const std::string& text) override {
    ssc::log(ssc::kLogWarn, "Simulated hub: %s", text.c_str());
  }

 private:
  std::unique_ptr<simhub::Hub> hub_;
  simhub::ClientId client_ = 0;
  IncomingQueue incoming_;
};

/// Replaces every %XX by the character of that code. False: a % without two hexadecimal digits.
bool decodePercent(std::string_view text, std::string* decoded) {
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      *decoded += text[i];
      continue;
    }
    const std::string_view digits = text.substr(i + 1, 2);
    unsigned code = 0;
    const auto [end, status] = std::from_chars(digits.data(), digits.data() + digits.size(), code, 16);
    if (digits.size() != 2 || status != std::errc{} || end != digits.data() + 2) return false;
    *decoded += static_cast<char>(code);
    i += 2;
  }
  return true;
}

/// The overrides of "K=V&K=V".
bool parseQuery(std::string_view query, std::vector<std::string>* overrides, std::string* error) {
  while (!query.empty()) {
    const std::size_t end = query.find('&');
    const std::string_view pair = query.substr(0, end);
    query = end == std::string_view::npos ? std::string_view{} : query.substr(end + 1);
    if (pair.empty()) continue;
    const std::size_t value = pair.find('=') == std::string_view::npos ? pair.size() : pair.find('=') + 1;
    overrides->emplace_back(pair.substr(0, value));
    if (!decodePercent(pair.substr(value), &overrides->back())) {
      *error = "\"" + std::string(pair) + "\": a % has to be followed by two hexadecimal digits";
      return false;
    }
  }
  return true;
}

/// What the environment says behind "sim", or nothing where the hub is a real one.
std::optional<std::string> simulation() {
  const char* const variable = std::getenv("VANTLE_HUB");  // NOLINT: no threads yet
  const std::string_view hub = variable != nullptr ? variable : "";
  if (!hub.starts_with(kSimulated)) return std::nullopt;
  const std::string_view description = hub.substr(kSimulated.size());
  if (!description.empty() && description.front() != ':' && description.front() != '?') return std::nullopt;
  return std::string(description);
}

/// The name or file in a description; empty for the default.
std::string scenarioOf(const std::string& description) {
  const std::string name = description.substr(0, description.find('?'));
  return name.empty() ? name : name.substr(1);
}

}  // namespace

bool prepareSimulatedHandset(std::FILE* err) {
  const std::optional<std::string> description = simulation();
  if (!description) return true;
  const std::string scenario = scenarioOf(*description);
  (void)std::fprintf(err, "This is a simulated hub (scenario %s): no handset is calibrated.\n",
                     scenario.empty() ? simhub::kDefaultScenario : scenario.c_str());
  std::string error;
  const std::string root = simhub::simulatedRoot(&error);
  if (root.empty() || !simhub::prepareSimulatedRoot(root, &error)) {
    (void)std::fprintf(err, "ERROR: Unable to make the simulated handset's folders: %s\n", error.c_str());
    return false;
  }
  return ::setenv("VANTLE_ROOT", root.c_str(), 1) == 0;  // NOLINT: no threads yet
}

int makeEmbeddedHub(const std::string& description, std::unique_ptr<ssc::EmbeddedHub>* hub,
                    std::string* error) {
  const std::size_t question = description.find('?');
  std::vector<std::string> overrides;
  if (question != std::string::npos &&
      !parseQuery(std::string_view(description).substr(question + 1), &overrides, error)) {
    return ssc::kInvalid;
  }
  simhub::Scenario scenario;
  if (!simhub::loadScenario(scenarioOf(description), overrides, &scenario, error)) return ssc::kInvalid;
  const std::string root = simhub::simulatedRoot(error);
  auto made = std::make_unique<EmbeddedSimulatedHub>();
  if (root.empty() || !made->Start(std::move(scenario), root, error)) return ssc::kInvalid;
  *hub = std::move(made);
  return ssc::kOk;
}

#endif

#include "simhub/Streams.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace simhub {
namespace {

/// The slowest a sensor runs, so that the time between two readings stays well in range.
constexpr double kMinRate = 1e-4;
/// How often an on-change sensor looks, where its rates do not say.
constexpr double kDefaultRate = 10;

Time periodOf(double rate) { return Time{std::llround(1e9 / rate)}; }

double allowedRate(const SensorConfig& config, double asked) {
  const double highest =
      config.rates.empty() ? std::clamp(asked, kDefaultRate, kMaxSensorRate) : config.rates.back();
  return std::max(kMinRate, asked > 0 ? std::min(asked, highest) : highest);
}

}  // namespace

Streams::Streams(const std::vector<std::unique_ptr<Sensor>>& sensors, const HubConfig& config,
                 EventQueue& queue, Outbox& outbox, FaultPlan& faults, HubStatistics& statistics)
    : sensors_(sensors),
      config_(config),
      queue_(queue),
      outbox_(outbox),
      faults_(faults),
      statistics_(statistics),
      running_(sensors.size()) {}

void Streams::Start(ClientId client, std::uint32_t sensor, const StreamRequest& request, Time now) {
  const SensorConfig& config = sensors_[sensor]->Config();
  Running& running = running_[sensor];
  std::erase_if(running.streams, [&](const auto& stream) { return stream->client == client; });
  auto stream = std::make_unique<Stream>();
  stream->client = client;
  stream->onChange = config.streamType != SNS_STD_SENSOR_STREAM_TYPE_STREAMING || !(request.rate > 0);
  stream->rate = allowedRate(config, request.rate);
  stream->period = periodOf(stream->rate);
  stream->due = stream->onChange ? now : now + stream->period;
  stream->batchPeriod = request.batchPeriod;
  stream->batchCount = std::max(1U, config.batch != 0 ? config.batch : config_.batch);
  sensors_[sensor]->Suid().CopyTo(stream->message.mutable_suid());
  running.streams.push_back(std::move(stream));
  adjust(sensor, now);
}

void Streams::Stop(ClientId client, std::uint32_t sensor, Time now) {
  Running& running = running_[sensor];
  if (std::erase_if(running.streams, [&](const auto& stream) { return stream->client == client; }) != 0) {
    adjust(sensor, now);
  }
}

void Streams::StopClient(ClientId client, Time now) {
  for (std::uint32_t sensor = 0; sensor < running_.size(); ++sensor) Stop(client, sensor, now);
}

void Streams::Clear() {
  for (Running& running : running_) {
    running.streams.clear();
    running.rate = 0;
    ++running.generation;
  }
}

void Streams::adjust(std::uint32_t sensor, Time now) {
  Running& running = running_[sensor];
  double rate = 0;
  bool firstAtOnce = false;
  for (const auto& stream : running.streams) {
    rate = std::max(rate, stream->rate);
    firstAtOnce = firstAtOnce || stream->onChange;
  }
  if (rate == running.rate) return;
  ++running.generation;
  const bool wasOff = running.rate == 0;
  running.rate = rate;
  if (rate == 0) return;
  if (wasOff) {
    running.switchedOn = running.base = now;
    running.next = firstAtOnce ? 0 : 1;
  } else {
    // The new rate counts from the last reading, but never so that a reading lies in the past.
    running.base = std::max(running.last, running.switchedOn);
    running.next = 1;
    const Time first = readingTime(running, 1);
    if (first < now) running.base += now - first;
  }
  planNext(sensor);
}

Time Streams::readingTime(const Running& running, std::uint64_t index) {
  // From the index, so that rounding a period to whole nanoseconds does not add up.
  return running.base + Time{std::llround(static_cast<double>(index) * 1e9 / running.rate)};
}

void Streams::planNext(std::uint32_t sensor) {
  const Running& running = running_[sensor];
  queue_.Push(readingTime(running, running.next) + sensors_[sensor]->Config().latency,
              HubEvent::Kind::kReading, sensor, running.generation);
}

bool Streams::TakeReading(const HubEvent& event, Time* back) {
  Running& running = running_[event.index];
  if (event.generation != running.generation) return false;
  const Sensor& sensor = *sensors_[event.index];
  const Time taken = readingTime(running, running.next);
  running.last = taken;
  ++running.next;
  const ReadingFaults faults = faults_.OnReading(event.index, event.time);
  encodeReading(event.index, taken, faults);
  const Time tolerance = periodOf(running.rate) / 2;
  bool anyEnded = false;
  for (const auto& stream : running.streams) {
    if (taken + tolerance < stream->due) continue;
    stream->due += stream->period;
    if (stream->due < taken) stream->due = taken + stream->period;  // as after a slower rate of the sensor
    if (!faults.silent) offer(sensor, *stream, taken, faults);
    anyEnded = anyEnded || stream->ended;
  }
  if (anyEnded) {
    std::erase_if(running.streams, [](const auto& stream) { return stream->ended; });
    adjust(event.index, event.time);
  }
  if (running.generation == event.generation) planNext(event.index);
  return faults_.GoesAway(event.index, event.time, back);
}

void Streams::encodeReading(std::uint32_t sensor, Time taken, const ReadingFaults& faults) {
  Sensor& source = *sensors_[sensor];
  const bool isSettled =
      taken - running_[sensor].switchedOn >= source.Config().settling && !faults.lowAccuracy;
  values_.clear();
  source.Read(taken, &values_);
  if (faults.notANumber) {
    std::fill(values_.begin(), values_.end(), std::numeric_limits<float>::quiet_NaN());
  }
  if (faults.keep && *faults.keep < values_.size()) values_.resize(*faults.keep);
  if (faults.extra) values_.resize(values_.size() + *faults.extra, 0);
  source.Encode(
      values_,
      isSettled ? SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_HIGH : SNS_STD_SENSOR_SAMPLE_STATUS_ACCURACY_LOW,
      event_.mutable_payload());
  if (faults.malformed) event_.set_payload(kUndecodablePayload);
  event_.set_msg_id(faults.messageId.value_or(source.EventId()));
  event_.set_timestamp(outbox_.Ticks(taken));
}

void Streams::offer(const Sensor& sensor, Stream& stream, Time taken, const ReadingFaults& faults) {
  if (stream.onChange) {
    if (stream.lastPayload == event_.payload()) return;
    stream.lastPayload = event_.payload();
  }
  stream.ended = sensor.Config().streamType == SNS_STD_SENSOR_STREAM_TYPE_SINGLE_OUTPUT;
  if (faults.reorder && !stream.isHolding && !stream.ended) {
    stream.held = event_;
    stream.isHolding = true;
    return;
  }
  append(stream, taken, event_);
  if (faults.duplicate) append(stream, taken, event_);
  if (stream.isHolding) append(stream, taken, stream.held);
  stream.isHolding = false;
}

void Streams::append(Stream& stream, Time taken, const EventMessage& event) {
  if (stream.message.events_size() == 0) {
    stream.batchSince = taken;
    stream.batchBytes = 0;
  }
  constexpr std::size_t kFraming = 24;  // tags, id and time stamp of an event
  *stream.message.add_events() = event;
  stream.batchBytes += event.payload().size() + kFraming;
  ++statistics_.readings;
  const bool isFull = stream.batchPeriod > Time::zero()
                          ? taken + stream.period - stream.batchSince >= stream.batchPeriod
                          : stream.message.events_size() >= static_cast<int>(stream.batchCount);
  if (!isFull && !stream.ended && stream.batchBytes < Outbox::kMaxEventBytes / 2) return;
  outbox_.Send(stream.client, stream.message);
  stream.message.clear_events();
}

}  // namespace simhub

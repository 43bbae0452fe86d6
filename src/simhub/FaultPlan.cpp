#include "simhub/FaultPlan.h"

#include <algorithm>

namespace simhub {
namespace {

Time backAt(const Fault& fault, Time now) {
  return fault.downFor ? std::min(kNever, now + std::min(*fault.downFor, kNever - now)) : kNever;
}

void add(const Fault& fault, ReadingFaults* faults) {
  switch (fault.kind) {
    case FaultKind::kSilent:
      faults->silent = true;
      break;
    case FaultKind::kLowAccuracy:
      faults->lowAccuracy = true;
      break;
    case FaultKind::kShortEvent:
      faults->keep = fault.values;
      break;
    case FaultKind::kExtraValues:
      faults->extra = fault.values;
      break;
    case FaultKind::kNan:
      faults->notANumber = true;
      break;
    case FaultKind::kMalformed:
      faults->malformed = true;
      break;
    case FaultKind::kWrongId:
      faults->messageId = fault.id;
      break;
    case FaultKind::kDuplicate:
      faults->duplicate = true;
      break;
    case FaultKind::kReorder:
      faults->reorder = true;
      break;
    default:
      break;
  }
}

void add(const Fault& fault, RequestFaults* faults) {
  switch (fault.kind) {
    case FaultKind::kQmiError:
      faults->qmiError = fault.error;
      break;
    case FaultKind::kErrorAnswer:
      faults->errorEvent = fault.error;
      break;
    case FaultKind::kNoResponse:
      faults->noResponse = true;
      break;
    case FaultKind::kLateResponse:
      faults->responseDelay = fault.delay;
      break;
    case FaultKind::kNoNotification:
      faults->noNotification = true;
      break;
    case FaultKind::kOemFailure:
      faults->oemFailure = true;
      break;
    case FaultKind::kOemSilence:
      faults->oemSilence = true;
      break;
    case FaultKind::kOemMalformed:
      faults->oemMalformed = true;
      break;
    default:
      break;
  }
}

}  // namespace

bool FaultPlan::Active::Strike(Time now) {
  ++occasions;
  if (!InWindow(now) || occasions <= fault.after || struck >= fault.count) return false;
  ++struck;
  return true;
}

FaultPlan::FaultPlan(const std::vector<Fault>& faults, const std::vector<Addressee>& addressees)
    : onReadings_(addressees.size()), onRequests_(addressees.size()), onHub_(addressees.size()) {
  for (const Fault& fault : faults) {
    const std::size_t index = faults_.size();
    faults_.push_back({fault});
    for (std::size_t i = 0; i < addressees.size(); ++i) {
      const Addressee& addressee = addressees[i];
      if (!fault.sensor.empty() && fault.sensor != addressee.key && fault.sensor != addressee.dataType)
        continue;
      switch (faultKindRow(fault.kind).scope) {
        case FaultScope::kEvents:
          onReadings_[i].push_back(index);
          break;
        case FaultScope::kRequests:
          onRequests_[i].push_back(index);
          break;
        case FaultScope::kHub:
          onHub_[i].push_back(index);
          break;
        case FaultScope::kRegistry:
          break;
      }
    }
  }
}

bool FaultPlan::IsAbsent(std::uint32_t addressee, Time now) const {
  return std::any_of(onRequests_[addressee].begin(), onRequests_[addressee].end(), [&](std::size_t index) {
    return faults_[index].fault.kind == FaultKind::kAbsent && faults_[index].InWindow(now);
  });
}

ReadingFaults FaultPlan::OnReading(std::uint32_t addressee, Time now) {
  ReadingFaults faults;
  for (const std::size_t index : onReadings_[addressee]) {
    if (faults_[index].Strike(now)) add(faults_[index].fault, &faults);
  }
  return faults;
}

RequestFaults FaultPlan::OnRequest(std::uint32_t addressee, std::uint32_t messageId, Time now) {
  RequestFaults faults;
  for (const std::size_t index : onRequests_[addressee]) {
    Active& active = faults_[index];
    if (active.fault.message && *active.fault.message != messageId) continue;
    if (active.Strike(now)) add(active.fault, &faults);
  }
  return faults;
}

bool FaultPlan::OnRegistry(FaultKind kind, const std::string& group, Time now,
                           std::vector<std::string>* items) {
  bool strikes = false;
  for (Active& active : faults_) {
    if (active.fault.kind != kind) continue;
    if (!active.fault.group.empty() && active.fault.group != group) continue;
    if (!active.Strike(now)) continue;
    strikes = true;
    if (items != nullptr) items->push_back(active.fault.item);
  }
  return strikes;
}

std::vector<std::string> FaultPlan::TornGroups() const {
  std::vector<std::string> groups;
  for (const Active& active : faults_) {
    if (active.fault.kind != FaultKind::kTornFile) continue;
    groups.push_back(active.fault.group.empty() ? "*" : active.fault.group);
  }
  return groups;
}

std::optional<std::uint64_t> FaultPlan::FreeBytes(Time now) {
  for (Active& active : faults_) {
    if (active.fault.kind == FaultKind::kFullDisk && active.Strike(now)) return active.fault.freeBytes;
  }
  return std::nullopt;
}

bool FaultPlan::GoesAway(std::uint32_t addressee, Time now, Time* back) {
  bool goes = false;
  for (const std::size_t index : onHub_[addressee]) {
    Active& active = faults_[index];
    if (active.fault.after == 0 || !active.InWindow(now) || active.struck >= active.fault.times) continue;
    if (++active.occasions < active.fault.after) continue;
    ++active.struck;
    *back = backAt(active.fault, now);
    goes = true;
  }
  return goes;
}

std::vector<FaultPlan::Departure> FaultPlan::Departures() const {
  std::vector<Departure> departures;
  for (const Active& active : faults_) {
    if (active.fault.kind != FaultKind::kHubAway || active.fault.after != 0) continue;
    departures.push_back({active.fault.from, backAt(active.fault, active.fault.from)});
  }
  return departures;
}

void FaultPlan::OnReturn() {
  for (Active& active : faults_) {
    if (active.fault.kind == FaultKind::kHubAway) active.occasions = 0;
  }
}

}  // namespace simhub

#include "framework/Calibrator.h"

#include <algorithm>
#include <utility>

#include <unistd.h>

#include "framework/LowerCase.h"
#include "ssc/AttrUtil.h"
#include "ssc/Log.h"
#include "ssc/SuidUtil.h"
#include "ssc/Ticks.h"

namespace {

constexpr std::uint32_t kToleratedReconnections = 3;
constexpr std::chrono::seconds kAnswerTime{3};
// What a sample takes while it is kept: itself, what is computed for it, and room that its list has not used
// yet.
constexpr double kBytesPerSample = 80;

/// Whether the sensor's stream type is `streamType` and, if so, the package that its name stands for. Results
/// as of the library.
int packageOf(const sns_std_attr_event& attributes, sns_std_sensor_stream_type streamType, bool* isOfType,
              std::string* package) {
  sns_std_sensor_stream_type type{};
  int result = ssc::AttrUtil::GetStreamType(attributes, &type);
  if (result != ssc::kOk) return result;
  *isOfType = type == streamType;
  if (!*isOfType) return ssc::kOk;
  result = ssc::AttrUtil::GetName(attributes, package);
  if (result == ssc::kOk) Calibrator::SensorNameToPackageName(package);
  return result;
}

int readPackage(ssc::AttrUtil& attributeUtil, const ssc::SensorUid& suid,
                sns_std_sensor_stream_type streamType, bool* isOfType, std::string* package) {
  sns_std_attr_event attributes;
  const int result = attributeUtil.LoadAttributes(suid, &attributes);
  return result == ssc::kOk ? packageOf(attributes, streamType, isOfType, package) : result;
}

/// The first of the sensors of `dataType` that is of the package and the stream type, or null.
const ssc::SensorUid* findInPackage(ssc::AttrUtil& attributeUtil, const std::string& dataType,
                                    const std::vector<ssc::SensorUid>& suids, const std::string& package,
                                    sns_std_sensor_stream_type streamType) {
  for (const ssc::SensorUid& suid : suids) {
    sns_std_attr_event attributes;
    if (!Calibrator::LoadCandidate(attributeUtil, dataType, suid, &attributes)) continue;
    bool isOfType = false;
    std::string itsPackage;
    if (packageOf(attributes, streamType, &isOfType, &itsPackage) != ssc::kOk) continue;
    if (isOfType && itsPackage == package) return &suid;
  }
  return nullptr;
}

}  // namespace

Calibrator::Calibrator(ssc::Connection* hubConnection, const char* usage, const char* options)
    : ssc::Client(hubConnection), usage_(usage), options_(options) {}

void Calibrator::OnEvent(const sns_client_event_msg& message) {
  HandleEvents("virtual void Calibrator::OnEvent(const sns_client_event_msg &)", message);
}

void Calibrator::HandleEvents(const char* function, const sns_client_event_msg& message) {
  ssc::logFunc(function, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  const ssc::SensorUid suid(message.suid());
  const auto isLast = [&](const Event& event) { return endsWait(suid, event); };
  if (std::any_of(message.events().begin(), message.events().end(), isLast)) condition.notify_all();
  ssc::logFunc(function, "<--");
}

bool Calibrator::endsWait(const ssc::SensorUid& suid, const Event& event) {
  LogErrorEvent(suid, event);
  if (event.msg_id() != ssc::kSensorEvent) return OnOtherEvent(event);
  if (!event_.ParseFromString(event.payload())) {
    ssc::log(ssc::kLogError, "Received malformed sensor event");
    status = ssc::kMalformed;
    return true;
  }
  return !isShort(suid, event_) && OnSensorEvent(suid, event.timestamp(), event_);
}

bool Calibrator::OnOtherEvent(const Event& /*event*/) { return false; }

void Calibrator::LogErrorEvent(const ssc::SensorUid& suid, const Event& event) const {
  sns_std_error_event error;
  if (event.msg_id() != ssc::kErrorEvent || !error.ParseFromString(event.payload())) return;
  const auto info = sensorInfo.find(suid);
  ssc::log(hubTroubleLevel, "The hub reports error %d of %s", static_cast<int>(error.error()),
           info == sensorInfo.end() ? "a sensor" : info->second.name.c_str());
}

bool Calibrator::isShort(const ssc::SensorUid& suid, const sns_std_sensor_event& event) {
  const auto info = sensorInfo.find(suid);
  const auto valueCount = static_cast<std::size_t>(event.data_size());
  const std::size_t needed =
      info == sensorInfo.end() ? SensorInfo().minimumValues : info->second.minimumValues;
  if (valueCount >= needed) return false;
  if (shortEventsReported_.insert(suid).second) {
    ssc::log(ssc::kLogWarn, "Dropping %s events with fewer than %zu values (this is said once)",
             info == sensorInfo.end() ? "sensor" : info->second.name.c_str(), needed);
  }
  return true;
}

bool Calibrator::OnSensorEvent(const ssc::SensorUid& suid, std::uint64_t timestamp,
                               const sns_std_sensor_event& event) {
  samples[suid].emplace_back(ssc::ticksToSeconds(timestamp), event.data().begin(), event.data().end());
  return false;
}

void Calibrator::OnReconnect() {
  constexpr const char* kFunction = "virtual void Calibrator::OnReconnect()";
  ssc::logFunc(kFunction, "-->");
  const std::lock_guard<std::mutex> guard(mutex);
  status = ssc::kOk;
  // Counted over the whole run: a retry that succeeded is not forgotten.
  const std::uint32_t before = retryCount_++;
  bool failed = true;
  if (before < kToleratedReconnections) {
    ssc::log(ssc::kLogDebug, "Retry %u", retryCount_);
    for (const std::string& request : GetAllConfigRequests()) {
      status = SendRequest(request);
      if (status != ssc::kOk) break;
    }
    failed = status != ssc::kOk;
    if (failed) {
      ssc::log(hubTroubleLevel, "Unable to start the sensors after the hub was away. Error = %d", status);
    }
  } else {
    ssc::log(hubTroubleLevel, "The hub went away more than %u times", kToleratedReconnections);
    ssc::log(ssc::kLogDebug, "Exhausted all retries");
    retryCount_ = 0;
    status = ssc::kConnectionLost;
  }
  if (failed) {
    ssc::log(ssc::kLogDebug, "Retry failed");
    condition.notify_all();
  }
  ssc::logFunc(kFunction, "<--");
}

bool Calibrator::LoadCandidate(ssc::AttrUtil& attributeUtil, const std::string& dataType,
                               const ssc::SensorUid& suid, sns_std_attr_event* attributes) {
  const int result = attributeUtil.LoadAttributes(suid, attributes);
  if (result == ssc::kOk) return true;
  ssc::log(ssc::kLogWarn, "Unable to read the attributes of a %s sensor. Error = %d", dataType.c_str(),
           result);
  return false;
}

void Calibrator::SensorNameToPackageName(std::string* name) {
  if (name == nullptr) return;
  std::size_t end = name->find(' ');
  if (end == std::string::npos) end = name->find('_');
  if (end != std::string::npos) name->resize(end);
}

int Calibrator::LookupSuidsByName(const std::vector<std::string>& dataTypes,
                                  std::map<std::string, ssc::SensorUid>* suids, std::string* packageName,
                                  sns_std_sensor_stream_type streamType) {
  ssc::SuidUtil suidUtil(connection);
  ssc::AttrUtil attributeUtil(connection);
  if (suids != nullptr) suids->clear();
  std::string package;
  for (const std::string& dataType : dataTypes) {
    std::vector<ssc::SensorUid> found;
    int result = suidUtil.Lookup(dataType, &found);
    if (result != ssc::kOk) return result;
    if (found.empty()) return ssc::kNotFound;
    if (package.empty()) {
      // The first sensor decides the package. One of another stream type is taken all the same, and the
      // next data type decides.
      if (suids != nullptr) suids->emplace(dataType, found.front());
      bool isOfType = false;
      result = readPackage(attributeUtil, found.front(), streamType, &isOfType, &package);
      if (result != ssc::kOk) return result;
    }
    if (package.empty()) continue;
    const ssc::SensorUid* const suid = findInPackage(attributeUtil, dataType, found, package, streamType);
    if (suid == nullptr) {
      ssc::log(ssc::kLogError, "Unable to find %s for %s", dataType.c_str(), package.c_str());
      return ssc::kNotFound;
    }
    if (suids != nullptr) suids->emplace(dataType, *suid);
  }
  if (packageName != nullptr) *packageName = toLowerAscii(std::move(package));
  return ssc::kOk;
}

bool Calibrator::LookupCompanion(const ssc::SensorUid& sensor, const std::string& dataType,
                                 sns_std_sensor_stream_type streamType, ssc::SensorUid* companion) {
  std::vector<ssc::SensorUid> found;
  if (ssc::SuidUtil(connection).Lookup(dataType, &found) != ssc::kOk) return false;
  ssc::AttrUtil attributeUtil(connection);
  bool isOfType = false;
  std::string package;
  if (readPackage(attributeUtil, sensor, streamType, &isOfType, &package) != ssc::kOk || !isOfType)
    return false;
  const ssc::SensorUid* const suid = findInPackage(attributeUtil, dataType, found, package, streamType);
  if (suid == nullptr) return false;
  *companion = *suid;
  return true;
}

void Calibrator::SetSensorInfo(const ssc::SensorUid& suid, const std::string& name, float rateHz,
                               std::size_t minimumValues) {
  sensorInfo.emplace(suid, SensorInfo{name, rateHz, minimumValues});
}

std::vector<std::string> Calibrator::GetAllConfigRequests() const {
  std::vector<std::string> requests;
  requests.reserve(sensorInfo.size());
  for (const auto& [suid, info] : sensorInfo) requests.push_back(MakeConfigRequest(suid, info.rate, 0));
  return requests;
}

void Calibrator::DisableAllSensors() {
  // Results do not matter: the hub forgets a client's requests when it goes.
  for (const auto& entry : sensorInfo) SendRequest(MakeDisableRequest(entry.first));
}

int Calibrator::requireMemory(std::chrono::duration<double> period) const {
  if (!keepsSamples) return ssc::kOk;
  double samplesPerSecond = 0;
  for (const auto& entry : sensorInfo)
    samplesPerSecond += std::max(0.0, static_cast<double>(entry.second.rate));
  const double needed = period.count() * samplesPerSecond * kBytesPerSample;
  const double installed =
      static_cast<double>(::sysconf(_SC_PHYS_PAGES)) * static_cast<double>(::sysconf(_SC_PAGESIZE));
  if (needed <= installed) return ssc::kOk;
  ssc::log(ssc::kLogError, "The samples of %.0f seconds take %.0f MB, more memory than there is",
           period.count(), needed / 1e6);
  return ssc::kInvalid;
}

std::vector<std::string> Calibrator::beginCollection() {
  ssc::say("Collecting samples...\n");
  const std::lock_guard<std::mutex> guard(mutex);
  status = ssc::kOk;
  samples.clear();
  return GetAllConfigRequests();
}

int Calibrator::AskSensor(const sns_client_request_msg& request) {
  {
    const std::lock_guard<std::mutex> guard(mutex);
    status = ssc::kOk;
    samples.clear();
    awaitsAnswer = true;
  }
  const int result = SendRequestsAndWait({request.SerializeAsString()}, kAnswerTime, nullptr);
  const std::lock_guard<std::mutex> guard(mutex);
  awaitsAnswer = false;
  return result;
}

void Calibrator::endCollection(int result, bool print) {
  if (!waited()) {
    ssc::log(hubTroubleLevel, "Unable to start the sensors. Error = %d", result);
    // A response that never came counts as time that has run out. The few readings that came before it, of
    // sensors not yet settled, must not be taken for the measurement.
    samples.clear();
  }
  DisableAllSensors();
  if (print) PrintSamples();
}

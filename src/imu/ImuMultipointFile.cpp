#include "imu/ImuMultipointFile.h"

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <cstring>
#include <sstream>

#include <sys/stat.h>
#include <unistd.h>

#include "ssc/WorkingFile.h"

namespace {

constexpr std::size_t kPositionFloats = 7;
constexpr std::size_t kPositionBytes = kPositionFloats * sizeof(float);
constexpr int kDigits = 16;

class File {
 public:
  File(const std::string& path, ssc::WorkingFileUse use) : file_(ssc::openWorkingFile(path, use)) {}

  [[nodiscard]] bool isOpen() const { return file_.valid(); }

  [[nodiscard]] off_t size() const {
    struct stat information {};
    return ::fstat(file_.get(), &information) == 0 ? information.st_size : 0;
  }

  /// Everything or nothing, and on the disk when it returns.
  [[nodiscard]] bool append(std::string_view bytes) {
    const off_t before = size();
    std::size_t written = 0;
    while (written < bytes.size()) {
      const ssize_t count = ::write(file_.get(), bytes.data() + written, bytes.size() - written);
      if (count < 0 && errno == EINTR) continue;
      if (count <= 0) break;
      written += static_cast<std::size_t>(count);
    }
    // EINVAL: something that has no disk behind it.
    if (written == bytes.size() && (::fsync(file_.get()) == 0 || errno == EINVAL)) return true;
    truncate(before);
    return false;
  }

  void truncate(off_t size) {
    // Nothing can be done about a failure, and the caller reports the write that led here.
    if (::ftruncate(file_.get(), size) != 0) errno = 0;
  }

  /// The file's whole content, up to kMaxImuFileBytes.
  [[nodiscard]] FileResult read(std::string* content) {
    content->clear();
    std::array<char, 4096> piece;
    for (;;) {
      const ssize_t count = ::read(file_.get(), piece.data(), piece.size());
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) return FileResult::kFailed;
      if (count == 0) return FileResult::kOk;
      content->append(piece.data(), static_cast<std::size_t>(count));
      if (content->size() > kMaxImuFileBytes) return FileResult::kTooLarge;
    }
  }

 private:
  ssc::Descriptor file_;
};

FileResult readFile(const std::string& path, std::string* content) {
  File file(path, ssc::WorkingFileUse::kRead);
  return file.isOpen() ? file.read(content) : FileResult::kCannotOpen;
}

/// Cuts the file behind its last line that is complete; whether there was something to cut.
bool dropUnfinishedLine(const std::string& path, File& file) {
  std::string content;
  if (readFile(path, &content) != FileResult::kOk || content.empty() || content.back() == '\n') return false;
  const std::size_t lastEnd = content.rfind('\n');
  file.truncate(lastEnd == std::string::npos ? 0 : static_cast<off_t>(lastEnd + 1));
  return true;
}

SampleData floatsAt(const char* bytes, std::size_t count) {
  SampleData values;
  values.resize(count);
  std::memcpy(values.data(), bytes, count * sizeof(float));
  return values;
}

}  // namespace

ImuCalibrationInfo::ImuCalibrationInfo(const std::string& line) {
  std::istringstream stream(line);
  stream >> phase;
  const auto parse = [&stream](double& value) {
    // A number out of range would otherwise become the largest one.
    if (!(stream >> value)) value = 0;
  };
  std::for_each(accel_mean.begin(), accel_mean.end(), parse);
  std::for_each(gyro_mean.begin(), gyro_mean.end(), parse);
  parse(temp_mean);
  parse(rotation_integration_time);
  std::for_each(rotation_integration.begin(), rotation_integration.end(), parse);
}

std::string ImuCalibrationInfo::ToString() const {
  std::ostringstream text;
  text.precision(kDigits);
  text << phase;
  const auto write = [&text](double value) { text << ' ' << value; };
  std::for_each(accel_mean.begin(), accel_mean.end(), write);
  std::for_each(gyro_mean.begin(), gyro_mean.end(), write);
  write(temp_mean);
  write(rotation_integration_time);
  std::for_each(rotation_integration.begin(), rotation_integration.end(), write);
  return text.str();
}

bool ImuCalibrationInfo::IsFinite() const {
  const auto isFinite = [](double value) { return std::isfinite(value); };
  return std::all_of(accel_mean.begin(), accel_mean.end(), isFinite) &&
         std::all_of(gyro_mean.begin(), gyro_mean.end(), isFinite) && isFinite(temp_mean) &&
         isFinite(rotation_integration_time) &&
         std::all_of(rotation_integration.begin(), rotation_integration.end(), isFinite);
}

FileResult appendCalibrationInfo(const ImuCalibrationInfo& info, const std::string& path, bool* dropped) {
  File file(path, ssc::WorkingFileUse::kAppend);
  if (!file.isOpen()) return FileResult::kCannotOpen;
  const bool hasDropped = dropUnfinishedLine(path, file);
  if (dropped != nullptr) *dropped = hasDropped;
  return file.append(info.ToString() + '\n') ? FileResult::kOk : FileResult::kFailed;
}

std::vector<ImuCalibrationInfo> parseCalibrationInfos(const std::string& content) {
  std::vector<ImuCalibrationInfo> infos;
  std::istringstream stream(content);
  for (std::string line; std::getline(stream, line);) infos.emplace_back(line);
  return infos;
}

FileResult readCalibrationInfos(const std::string& path, std::vector<ImuCalibrationInfo>* infos) {
  infos->clear();
  std::string content;
  const FileResult result = readFile(path, &content);
  if (result == FileResult::kOk) *infos = parseCalibrationInfos(content);
  return result;
}

FileResult appendPosition(const ImuPosition& position, const std::string& path, FileStart start) {
  File file(path,
            start == FileStart::kTruncate ? ssc::WorkingFileUse::kReplace : ssc::WorkingFileUse::kAppend);
  if (!file.isOpen()) return FileResult::kCannotOpen;
  std::string record;
  for (const SampleData* block : {&position.accel, &position.gyro, &position.temp}) {
    record.append(reinterpret_cast<const char*>(block->data()), block->size() * sizeof(float));
  }
  return file.append(record) ? FileResult::kOk : FileResult::kFailed;
}

FileResult parsePositions(const std::string& content, std::vector<ImuPosition>* positions) {
  positions->clear();
  for (std::size_t at = 0; at + kPositionBytes <= content.size(); at += kPositionBytes) {
    const char* const record = content.data() + at;
    positions->push_back({floatsAt(record, 3), floatsAt(record + 3 * sizeof(float), 3),
                          floatsAt(record + 6 * sizeof(float), 1)});
  }
  return content.size() % kPositionBytes == 0 ? FileResult::kOk : FileResult::kIncomplete;
}

FileResult readPositions(const std::string& path, std::vector<ImuPosition>* positions) {
  positions->clear();
  std::string content;
  const FileResult result = readFile(path, &content);
  return result == FileResult::kOk ? parsePositions(content, positions) : result;
}

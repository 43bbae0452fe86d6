#include "framework/DataFile.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstring>

#include <sys/stat.h>
#include <unistd.h>

#include "ssc/WorkingFile.h"

namespace {

constexpr std::size_t kPiece = 4096;

class File {
 public:
  File(const std::string& path, ssc::WorkingFileUse use) : file_(ssc::openWorkingFile(path, use)) {}
  File(const std::string& path, FileStart start)
      : File(path,
             start == FileStart::kTruncate ? ssc::WorkingFileUse::kReplace : ssc::WorkingFileUse::kAppend) {}

  [[nodiscard]] bool isOpen() const { return file_.valid(); }

  [[nodiscard]] off_t size() const {
    struct stat information {};
    return ::fstat(file_.get(), &information) == 0 ? information.st_size : 0;
  }

  enum class Wait { kForDisk, kForNothing };

  /// Everything or nothing, and on the disk when it returns if that is to be waited for.
  [[nodiscard]] bool append(std::string_view bytes, Wait wait = Wait::kForDisk) {
    const off_t before = size();
    std::size_t written = 0;
    while (written < bytes.size()) {
      const ssize_t count = ::write(file_.get(), bytes.data() + written, bytes.size() - written);
      if (count < 0 && errno == EINTR) continue;
      if (count <= 0) break;
      written += static_cast<std::size_t>(count);
    }
    // EINVAL: something that has no disk behind it.
    const auto isOnDisk = [&] {
      return wait == Wait::kForNothing || ::fsync(file_.get()) == 0 || errno == EINVAL;
    };
    if (written == bytes.size() && isOnDisk()) return true;
    truncate(before);
    return false;
  }

  void truncate(off_t size) {
    // Nothing can be done about a failure, and the caller reports the write that led here.
    if (::ftruncate(file_.get(), size) != 0) errno = 0;
  }

  [[nodiscard]] FileResult read(std::size_t maxBytes, std::string* content) {
    content->clear();
    std::array<char, kPiece> piece;
    for (;;) {
      const ssize_t count = ::read(file_.get(), piece.data(), piece.size());
      if (count < 0 && errno == EINTR) continue;
      if (count < 0) return FileResult::kFailed;
      if (count == 0) return FileResult::kOk;
      content->append(piece.data(), static_cast<std::size_t>(count));
      if (content->size() > maxBytes) return FileResult::kTooLarge;
    }
  }

  /// Where the last line that is complete ends: the file's size for sound text. Looked for from the end, so
  /// that a long file takes no longer. Negative when the file cannot be read.
  [[nodiscard]] off_t endOfLines() const {
    std::array<char, kPiece> piece;
    for (off_t end = size(); end > 0;) {
      const auto length = std::min(end, static_cast<off_t>(piece.size()));
      if (::pread(file_.get(), piece.data(), static_cast<std::size_t>(length), end - length) != length) {
        return -1;
      }
      const std::string_view text(piece.data(), static_cast<std::size_t>(length));
      const std::size_t newline = text.rfind('\n');
      if (newline != std::string_view::npos) return end - length + static_cast<off_t>(newline) + 1;
      end -= length;
    }
    return 0;
  }

 private:
  ssc::Descriptor file_;
};

/// Cuts the file behind its last line that is complete; whether there was something to cut.
bool dropUnfinishedLine(const std::string& path, File& file) {
  const File reader(path, ssc::WorkingFileUse::kRead);
  if (!reader.isOpen()) return false;
  const off_t end = reader.endOfLines();
  if (end < 0 || end == file.size()) return false;
  file.truncate(end);
  return true;
}

}  // namespace

FileResult appendToFile(const std::string& path, std::string_view bytes, FileStart start) {
  File file(path, start);
  if (!file.isOpen()) return FileResult::kCannotOpen;
  return file.append(bytes) ? FileResult::kOk : FileResult::kFailed;
}

FileResult appendLinesToFile(const std::string& path, std::string_view text, FileStart start, bool* dropped) {
  File file(path, start);
  if (!file.isOpen()) return FileResult::kCannotOpen;
  const bool hasDropped = dropUnfinishedLine(path, file);
  if (dropped != nullptr) *dropped = hasDropped;
  return file.append(text) ? FileResult::kOk : FileResult::kFailed;
}

FileResult appendToLogFile(const std::string& path, std::string_view line, FileStart start) {
  File file(path, start);
  if (!file.isOpen()) return FileResult::kCannotOpen;
  return file.append(line, File::Wait::kForNothing) ? FileResult::kOk : FileResult::kFailed;
}

FileResult readWholeFile(const std::string& path, std::size_t maxBytes, std::string* content) {
  File file(path, ssc::WorkingFileUse::kRead);
  return file.isOpen() ? file.read(maxBytes, content) : FileResult::kCannotOpen;
}

void appendFloats(const SampleData& values, std::string* record) {
  record->append(reinterpret_cast<const char*>(values.data()), values.size() * sizeof(float));
}

FileResult splitFloatRecords(const std::string& content, std::size_t floatsPerRecord,
                             std::vector<SampleData>* records) {
  records->clear();
  const std::size_t bytes = floatsPerRecord * sizeof(float);
  for (std::size_t at = 0; at + bytes <= content.size(); at += bytes) {
    SampleData& record = records->emplace_back();
    record.resize(floatsPerRecord);
    std::memcpy(record.data(), content.data() + at, bytes);
  }
  return content.size() % bytes == 0 ? FileResult::kOk : FileResult::kIncomplete;
}

#include "simhub/RegistryFiles.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <memory>
#include <thread>
#include <utility>

#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

namespace simhub {
namespace {

constexpr mode_t kFileMode = 0644;
constexpr mode_t kFolderMode = 0755;
constexpr std::chrono::milliseconds kLockPause{2};

/// An open file whose close is checked.
class File {
 public:
  File(const std::string& path, int flags) : fd_(::open(path.c_str(), flags | O_CLOEXEC, kFileMode)) {}
  File(const File&) = delete;
  File& operator=(const File&) = delete;
  ~File() { (void)Close(); }
  [[nodiscard]] bool IsOpen() const { return fd_ >= 0; }
  [[nodiscard]] int Descriptor() const { return fd_; }
  [[nodiscard]] int Close() {
    const int fd = std::exchange(fd_, -1);
    return fd >= 0 && ::close(fd) != 0 ? errno : 0;
  }

 private:
  int fd_;
};

int writeAll(int fd, const char* bytes, std::size_t size) {
  while (size > 0) {
    const ssize_t written = ::write(fd, bytes, size);
    if (written < 0 && errno == EINTR) continue;
    if (written < 0) return errno;
    bytes += written;
    size -= static_cast<std::size_t>(written);
  }
  return 0;
}

}  // namespace

RegistryFiles::RegistryFiles(std::string folder, std::chrono::milliseconds lockPatience)
    : folder_(std::move(folder)), lockPatience_(lockPatience) {
  while (folder_.size() > 1 && folder_.back() == '/') folder_.pop_back();
}

int RegistryFiles::CreateFolder() {
  for (std::size_t end = folder_.find('/', 1);; end = folder_.find('/', end + 1)) {
    if (::mkdir(folder_.substr(0, end).c_str(), kFolderMode) != 0 && errno != EEXIST) return errno;
    if (end == std::string::npos) return 0;
  }
}

int RegistryFiles::Lock(Descriptor* held) const {
  Descriptor folder(::open(folder_.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder.IsOpen()) return errno;
  const auto end = std::chrono::steady_clock::now() + lockPatience_;
  while (::flock(folder.get(), LOCK_EX | LOCK_NB) != 0) {
    if (errno == EINTR) continue;
    if (errno != EWOULDBLOCK) break;
    if (std::chrono::steady_clock::now() >= end) return EWOULDBLOCK;
    std::this_thread::sleep_for(kLockPause);
  }
  *held = std::move(folder);
  return 0;
}

int RegistryFiles::List(std::vector<std::string>* names) const {
  names->clear();
  const std::unique_ptr<DIR, int (*)(DIR*)> folder(::opendir(folder_.c_str()), ::closedir);
  if (folder == nullptr) return errno == ENOENT || errno == ENOTDIR ? 0 : errno;
  errno = 0;
  while (const dirent* entry = ::readdir(folder.get())) {
    const std::string name = entry->d_name;
    if (name != "." && name != "..") names->push_back(name);
  }
  const int failure = errno;
  std::sort(names->begin(), names->end());
  return failure;
}

int RegistryFiles::Read(const std::string& name, std::size_t limit, std::string* content) const {
  content->clear();
  const File file(Path(name), O_RDONLY | O_NONBLOCK);  // a named pipe must not hold the hub up
  if (!file.IsOpen()) return errno;
  struct stat status {};
  if (::fstat(file.Descriptor(), &status) != 0) return errno;
  if (!S_ISREG(status.st_mode)) return EINVAL;
  char buffer[4096];
  for (;;) {
    const ssize_t got = ::read(file.Descriptor(), buffer, sizeof buffer);
    if (got < 0 && errno == EINTR) continue;
    if (got < 0) return errno;
    if (got == 0) return 0;
    content->append(buffer, static_cast<std::size_t>(got));
    if (content->size() > limit) return EFBIG;
  }
}

int RegistryFiles::Write(const std::string& name, const std::string& content) {
  File file(Path(name), O_WRONLY | O_CREAT | O_TRUNC);
  if (!file.IsOpen()) return errno;
  std::size_t room = content.size();
  if (freeBytes_) {
    room = static_cast<std::size_t>(std::min<std::uint64_t>(room, *freeBytes_));
    *freeBytes_ -= room;
  }
  if (const int error = writeAll(file.Descriptor(), content.data(), room); error != 0) return error;
  if (room < content.size()) return ENOSPC;
  if (::fsync(file.Descriptor()) != 0) return errno;
  return file.Close();
}

int RegistryFiles::Rename(const std::string& from, const std::string& to) {
  return std::rename(Path(from).c_str(), Path(to).c_str()) != 0 ? errno : 0;
}

int RegistryFiles::Remove(const std::string& name) {
  return ::unlink(Path(name).c_str()) != 0 && errno != ENOENT ? errno : 0;
}

int RegistryFiles::SyncFolder() {
  const File folder(folder_, O_RDONLY | O_DIRECTORY);
  if (!folder.IsOpen()) return errno;
  return ::fsync(folder.Descriptor()) != 0 ? errno : 0;
}

}  // namespace simhub

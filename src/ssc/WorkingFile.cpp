#include "ssc/WorkingFile.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>

namespace ssc {
namespace {

constexpr mode_t kMode = 0644;

int flagsOf(WorkingFileUse use) {
  // O_NONBLOCK: a pipe that stands where the file should be is no reason to hang.
  constexpr int kAlways = O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK;
  return kAlways | (use == WorkingFileUse::kRead ? O_RDONLY : O_WRONLY | O_APPEND | O_CREAT);
}

}  // namespace

Descriptor openWorkingFile(const std::string& path, WorkingFileUse use) {
  Descriptor file(::open(path.c_str(), flagsOf(use), kMode));
  if (!file.valid()) return file;
  struct stat status {};
  int error = ::fstat(file.get(), &status) == 0 ? 0 : errno;
  const bool isRegular = S_ISREG(status.st_mode);
  if (error == 0 && isRegular && status.st_nlink > 1) error = EMLINK;
  // Emptied only now that it is known whose file it is: O_TRUNC would have done so before any look at it.
  const bool empties = error == 0 && isRegular && use == WorkingFileUse::kReplace;
  if (empties && ::ftruncate(file.get(), 0) != 0) error = errno;
  if (error == 0) return file;
  file.reset();
  errno = error;
  return file;
}

int removeWorkingFile(const std::string& path) {
  return ::unlink(path.c_str()) == 0 || errno == ENOENT ? 0 : -errno;
}

}  // namespace ssc

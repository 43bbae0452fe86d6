#include "main/StandardStreams.h"

#include <fcntl.h>
#include <unistd.h>

void openMissingStandardStreams() {
  // The lowest free number is always taken, so that the first one above the streams shows that none is free.
  int descriptor = 0;
  do {
    descriptor = ::open("/dev/null", O_RDWR | O_CLOEXEC);
  } while (descriptor >= 0 && descriptor <= STDERR_FILENO);
  if (descriptor >= 0) ::close(descriptor);
}

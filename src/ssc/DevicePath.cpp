#include "ssc/DevicePath.h"

#include <cstdlib>

namespace ssc {

std::string devicePath(const std::string& path) {
#ifdef VANTLE_HANDSET
  return path;
#else
  const char* root =
      std::getenv("VANTLE_ROOT");  // NOLINT: the environment is only changed before threads exist
  return (root != nullptr && *root != '\0') ? std::string(root) + path : path;
#endif
}

bool isSafeFileName(const std::string& name) {
  return !name.empty() && name.front() != '.' && name.find('/') == std::string::npos &&
         name.find('\0') == std::string::npos;
}

}  // namespace ssc

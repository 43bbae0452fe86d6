#pragma once

#include <string>

namespace ssc {

/// Where a path of the handset ("/persist/sensors/…") lies here: behind the folder that the environment
/// variable VANTLE_ROOT names, if any. Every absolute device path goes through this function. A handset build
/// returns the path unchanged.
std::string devicePath(const std::string& path);

/// Whether text from the hub may become part of a file name: not empty, no '/', no zero byte, no leading '.'.
bool isSafeFileName(const std::string& name);

}  // namespace ssc

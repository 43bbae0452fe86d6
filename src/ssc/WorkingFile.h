// The files that a calibration leaves for its next step, or for whoever looks into a unit that failed.
//
// They lie in a folder that others on the handset may write, and the program may write everywhere: a link
// that somebody put in such a file's place must not make it empty, fill or read another file.
#pragma once

#include <string>

#include "ssc/transport/Descriptor.h"

namespace ssc {

enum class WorkingFileUse {
  kRead,     ///< reads from the start
  kAppend,   ///< writes at the end; makes the file where there is none
  kReplace,  ///< the same, with an empty file
};

/// Opens the file at `path` (a path of this machine: put device paths through devicePath first). It closes
/// with exec, and nothing that stands in the file's place makes the call wait. Not valid on failure, with the
/// reason in errno: ELOOP where `path` is a symbolic link, EMLINK where the file has a second name, so that
/// it is, or may be, somebody else's.
[[nodiscard]] Descriptor openWorkingFile(const std::string& path, WorkingFileUse use);

/// Removes what stands at `path`; of a link, the link. 0, also where nothing is there, or a negated errno.
[[nodiscard]] int removeWorkingFile(const std::string& path);

}  // namespace ssc

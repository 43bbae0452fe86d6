// The results that the library and the commands return: 0, or a negated errno value. They end as the
// process's exit status.
#pragma once

namespace ssc {

inline constexpr int kOk = 0;
inline constexpr int kNotPermitted = -1;        ///< a file could not be opened or deleted
inline constexpr int kNotFound = -2;            ///< no such sensor, no such registry group
inline constexpr int kIoError = -5;             ///< the hub refused a request or a write
inline constexpr int kConnectionLost = -11;     ///< the hub went away more often than a run tolerates
inline constexpr int kNoHub = -19;              ///< nothing listens where the hub should be
inline constexpr int kInvalid = -22;            ///< bad option, argument or contents, or a failed check
inline constexpr int kNotSupported = -38;       ///< not for this device type
inline constexpr int kNoData = -61;             ///< not enough data, or an attribute that is absent
inline constexpr int kNotConnected = -107;      ///< the connection is down
inline constexpr int kTimedOut = -110;          ///< a timed wait ran out
inline constexpr int kMalformed = -2147483647;  ///< 0x80000001: an event that does not parse
inline constexpr int kShortFile = -2147483646;  ///< 0x80000002: a short read or write of a data file

}  // namespace ssc

// The items of a registry group, as commands read and change them. Groups travel whole: read, checked,
// changed in memory, written.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "proto/sns_registry.pb.h"

// Reading. Names may be dotted ("bias.x").

/// 0 when the item is there, of whatever kind; otherwise ssc::kInvalid after the level-0 message
/// `Invalid registry; missing "name"`. With `owner` ("accel") the message has that word before the name.
[[nodiscard]] int requireItem(const char* name, const sns_registry_data& data, const char* owner = nullptr);

/// The item's value; 0 when it is absent or of another kind.
[[nodiscard]] float floatItem(const char* name, const sns_registry_data& data);
[[nodiscard]] std::int64_t intItem(const char* name, const sns_registry_data& data);

/// The first `count` numbers of a vector item. 0; ssc::kInvalid after a level-0 message when the item is
/// missing, holds no subgroup, or fewer floats than that.
[[nodiscard]] int readVectorItem(const char* name, std::size_t count, const sns_registry_data& data,
                                 std::vector<float>* values);
/// The nine numbers of a matrix item in row order; results as above.
[[nodiscard]] int readMatrixItem(const char* name, const sns_registry_data& data, std::vector<float>* values);
/// The three numbers on a matrix item's diagonal; results as above.
[[nodiscard]] int readDiagonalItem(const char* name, const sns_registry_data& data,
                                   std::vector<float>* values);

// Writing: the item gets its version raised by one (or 1), is made when it is missing, and is cleared when it
// holds another kind of data. The number items of a vector or matrix get their versions raised too.

void setFloatItem(const char* name, float value, sns_registry_data* data);
void setIntItem(const char* name, std::int64_t value, sns_registry_data* data);
/// The text is stored as it is: a caller that wants the terminating zero byte stored includes it.
void setStringItem(const char* name, std::string_view value, sns_registry_data* data);
/// One to three values.
void setVectorItem(const char* name, const std::vector<float>& values, sns_registry_data* data);
/// Nine values in row order, or three for the diagonal.
void setMatrixItem(const char* name, const std::vector<float>& values, sns_registry_data* data);

/// Where the file of a group lies. The group's name comes from the hub: one that is not a plain file name
/// is ssc::kInvalid after a level-0 message, so that it can never lead out of the registry's folder.
[[nodiscard]] int registryFilePath(const std::string& group, std::string* path);

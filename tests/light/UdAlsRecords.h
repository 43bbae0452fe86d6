// Records of the working file for tests of what is computed from them.
#pragma once

#include <initializer_list>
#include <utility>

#include "light/UdAlsFiles.h"

/// A record with these values and zeros elsewhere.
inline SampleData makeUdAlsRecord(std::initializer_list<std::pair<std::size_t, float>> values) {
  SampleData record;
  record.resize(kUdAlsRecordValues);
  for (const auto& [index, value] : values) record[index] = value;
  return record;
}

#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <thread>
#include <vector>

#include "ssc/SensorUid.h"
#include "ssc/transport/Descriptor.h"

/// A hub that floods: it accepts one client on a Unix-domain socket, answers each request, and from the first
/// request on sends sensor events as fast as the client takes them.
class Flood {
 public:
  /// Listens at once. `eventsPerReport` readings of `valuesPerEvent` numbers go into each datagram.
  Flood(std::string path, std::size_t eventsPerReport, std::size_t valuesPerEvent);
  ~Flood();

  [[nodiscard]] const std::string& path() const { return path_; }
  static ssc::SensorUid sensor() { return {0x1111, 0x2222}; }

 private:
  void serve();
  [[nodiscard]] bool answerRequest(int client) const;

  std::string path_;
  std::vector<std::uint8_t> report_;
  ssc::Descriptor listener_;
  std::thread thread_;
};

// One text line per decoded request, for whoever wants to see or pin what a client sends:
//
//   0.000200 suid 512 data_type="pressure"
//   0.001400 pressure_raw 513 rate=20 batch_us=0
//   2.003000 registry 513 name="barochip_0_platform.pressure.fac_cal" {bias#2={x#2=2.75}, mean_temp#2=27.5}
//
// Hub time in seconds, the addressee's key, the message id, the payload. The same run gives the same lines.
#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>

#include "proto/sns_client.pb.h"
#include "simhub/HubTime.h"

namespace simhub {

/// Whom a request goes to, as far as it decides what its payload means.
enum class AddresseeKind { kUnknown, kLookup, kRegistry, kSensor };

/// The payload of a request in readable form; what is not known, in hexadecimal.
[[nodiscard]] std::string formatRequest(AddresseeKind kind, const sns_client_request_msg& request);

class RequestLog {
 public:
  /// Opens the file anew. 0 or an errno value.
  [[nodiscard]] int Open(const std::string& path);
  [[nodiscard]] bool IsOpen() const { return file_ != nullptr; }

  void Write(Time now, const std::string& addressee, AddresseeKind kind,
             const sns_client_request_msg& request);

 private:
  struct Closer {
    void operator()(std::FILE* file) const { (void)std::fclose(file); }
  };
  std::unique_ptr<std::FILE, Closer> file_;
};

}  // namespace simhub

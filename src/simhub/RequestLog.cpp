#include "simhub/RequestLog.h"

#include <algorithm>
#include <cerrno>
#include <cinttypes>
#include <string_view>

#include "proto/sns_registry.pb.h"
#include "proto/sns_suid.pb.h"
#include "simhub/Protocol.h"

namespace simhub {
namespace {

constexpr int kMaxShownDepth = 32;

/// In quotes, with what is not printable ASCII as \xHH.
std::string quoted(const std::string& text) {
  std::string shown = "\"";
  for (const char c : text) {
    if (c >= ' ' && c <= '~' && c != '"' && c != '\\') {
      shown += c;
      continue;
    }
    char escaped[8];
    (void)std::snprintf(escaped, sizeof escaped, "\\x%02x",
                        static_cast<unsigned>(static_cast<unsigned char>(c)));
    shown += escaped;
  }
  return shown + "\"";
}

/// An item's name: as it is, but in quotes where it could be taken for what stands around it.
std::string named(const std::string& name) {
  const bool isPlain = std::all_of(name.begin(), name.end(), [](char c) {
    return c > ' ' && c <= '~' && std::string_view("\"\\#={},").find(c) == std::string_view::npos;
  });
  return isPlain && !name.empty() ? name : quoted(name);
}

/// Nine digits: every float has its own text.
std::string number(float value) {
  char text[32];
  (void)std::snprintf(text, sizeof text, "%.9g", static_cast<double>(value));
  return text;
}

std::string hexadecimal(const std::string& bytes) {
  std::string shown = "0x";
  for (const char c : bytes) {
    char digits[4];
    (void)std::snprintf(digits, sizeof digits, "%02x", static_cast<unsigned>(static_cast<unsigned char>(c)));
    shown += digits;
  }
  return shown;
}

std::string formatItems(const sns_registry_data& data, int depth) {
  if (depth > kMaxShownDepth) return "{...}";
  std::string text = "{";
  for (const sns_registry_data_item& item : data.items()) {
    if (text.size() > 1) text += ", ";
    text += named(item.name());
    if (item.has_version()) text += "#" + std::to_string(item.version());
    switch (item.data_case()) {
      case sns_registry_data_item::kSubgrp:
        text += "=" + formatItems(item.subgrp(), depth + 1);
        break;
      case sns_registry_data_item::kStr:
        text += "=" + quoted(item.str());
        break;
      case sns_registry_data_item::kFlt:
        text += "=" + number(item.flt());
        break;
      case sns_registry_data_item::kSint:
        text += "=" + std::to_string(item.sint()) + "i";
        break;
      case sns_registry_data_item::DATA_NOT_SET:
        break;
    }
  }
  return text + "}";
}

/// Parses the payload as a Message and shows it; nothing when it is none.
template <class Message, class Show>
std::string shown(const std::string& payload, Show show) {
  Message message;
  return message.ParseFromString(payload) ? show(message) : std::string{};
}

std::string formatKnown(AddresseeKind kind, std::uint32_t messageId, const sns_std_request& request) {
  const std::string& payload = request.payload();
  if (messageId == kAttributesRequest) {
    return shown<sns_std_attr_req>(payload, [](const sns_std_attr_req& message) {
      return message.register_updates() ? std::string("register_updates=1") : std::string("attributes");
    });
  }
  if (kind == AddresseeKind::kLookup && messageId == kSuidRequest) {
    return shown<sns_suid_req>(payload, [](const sns_suid_req& message) {
      return "data_type=" + quoted(message.data_type()) + (message.default_only() ? " default_only=1" : "");
    });
  }
  if (kind == AddresseeKind::kRegistry && messageId == kRegistryReadRequest) {
    return shown<sns_registry_read_req>(
        payload, [](const sns_registry_read_req& message) { return "name=" + quoted(message.name()); });
  }
  if (kind == AddresseeKind::kRegistry && messageId == kRegistryWriteRequest) {
    return shown<sns_registry_write_req>(payload, [](const sns_registry_write_req& message) {
      return "name=" + quoted(message.name()) + " " + formatItems(message.data(), 0);
    });
  }
  if (kind == AddresseeKind::kSensor && messageId == kStreamConfigRequest) {
    return shown<sns_std_sensor_config>(payload, [&](const sns_std_sensor_config& message) {
      return "rate=" + number(message.sample_rate()) +
             " batch_us=" + std::to_string(request.batching().batch_period());
    });
  }
  if (kind == AddresseeKind::kSensor && messageId == kTestRequest) {
    return shown<sns_physical_sensor_test_config>(
        payload, [](const sns_physical_sensor_test_config& message) {
          return "test_type=" + std::to_string(static_cast<int>(message.test_type()));
        });
  }
  return {};
}

}  // namespace

std::string formatRequest(AddresseeKind kind, const sns_client_request_msg& request) {
  const std::string known = formatKnown(kind, request.msg_id(), request.request());
  if (!known.empty()) return known;
  return request.request().payload().empty() ? "-" : hexadecimal(request.request().payload());
}

int RequestLog::Open(const std::string& path) {
  file_.reset(std::fopen(path.c_str(), "we"));
  if (file_ == nullptr) return errno;
  // Line by line, so that the log can be read while the hub runs and survives its end.
  (void)std::setvbuf(file_.get(), nullptr, _IOLBF, BUFSIZ);
  return 0;
}

void RequestLog::Write(Time now, const std::string& addressee, AddresseeKind kind,
                       const sns_client_request_msg& request) {
  if (file_ == nullptr) return;
  constexpr std::int64_t kMicrosecond = 1000;
  const std::int64_t microseconds = now.count() / kMicrosecond;
  (void)std::fprintf(file_.get(), "%" PRId64 ".%06" PRId64 " %s %" PRIu32 " %s\n", microseconds / 1'000'000,
                     microseconds % 1'000'000, addressee.c_str(), request.msg_id(),
                     formatRequest(kind, request).c_str());
}

}  // namespace simhub

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <string_view>

#include "ssc/Log.h"
#include "ssc/Results.h"
#include "ssc/transport/EmbeddedHub.h"
#include "ssc/transport/QrtrTransport.h"
#include "ssc/transport/UnixTransport.h"

namespace ssc {
namespace {

#ifndef VANTLE_HANDSET

constexpr std::string_view kQrtr = "qrtr";
constexpr std::string_view kUnixPrefix = "unix:";
constexpr std::string_view kSimulated = "sim";

constexpr const char* kHowToChoose =
    "VANTLE_HUB chooses the hub (\"qrtr\", \"unix:PATH\" or \"sim\", \"sim:NAME\", \"sim:FILE\"), "
    "VANTLE_ROOT the folder in front of device paths";

int openUnixLink(const std::string& path, HubLink* link) {
  const int result = UnixTransport::Connect(path, &link->transport);
  if (result == kInvalid) {
    log(kLogError, "The socket path in VANTLE_HUB is empty or too long: \"%s\". %s", path.c_str(),
        kHowToChoose);
  } else if (result != kOk) {
    log(kLogError, "No sensor hub can be reached on the socket \"%s\" (%s). %s", path.c_str(),
        std::strerror(errno), kHowToChoose);
  } else {
    link->clock = std::make_unique<RealClock>();
  }
  return result;
}

int openEmbeddedLink(const std::string& description, const EmbeddedHubFactory& embeddedHub, HubLink* link) {
  if (!embeddedHub) {
    log(kLogError, "This program has no simulated hub. %s", kHowToChoose);
    return kNoHub;
  }
  std::unique_ptr<EmbeddedHub> hub;
  std::string error;
  const int result = embeddedHub(description, &hub, &error);
  if (result != kOk) {
    log(kLogError, "Unable to start the simulated hub: %s", error.c_str());
    return result;
  }
  *link = makeEmbeddedLink(std::move(hub));
  return kOk;
}

#endif

int openQrtrLink(const char* advice, HubLink* link) {
  std::string reason;
  const int result = QrtrTransport::Connect(&link->transport, &reason);
  if (result != kOk) {
    log(kLogError, "No sensor hub: %s%s%s", reason.c_str(), *advice != '\0' ? ". " : "", advice);
    return result;
  }
  link->clock = std::make_unique<RealClock>();
  return kOk;
}

}  // namespace

#ifdef VANTLE_HANDSET

int openHubLink(const EmbeddedHubFactory&, HubLink* link) { return openQrtrLink("", link); }

#else

int openHubLink(const EmbeddedHubFactory& embeddedHub, HubLink* link) {
  const char* variable =
      std::getenv("VANTLE_HUB");  // NOLINT: the environment is only changed before threads exist
  const std::string_view hub = variable != nullptr ? variable : "";
  if (hub.empty() || hub == kQrtr) return openQrtrLink(kHowToChoose, link);
  if (hub.starts_with(kUnixPrefix)) return openUnixLink(std::string(hub.substr(kUnixPrefix.size())), link);
  if (hub.starts_with(kSimulated)) {
    const std::string_view description = hub.substr(kSimulated.size());
    if (description.empty() || description.front() == ':' || description.front() == '?') {
      return openEmbeddedLink(std::string(description), embeddedHub, link);
    }
  }
  log(kLogError, "VANTLE_HUB makes no sense: \"%s\". %s", variable, kHowToChoose);
  return kInvalid;
}

#endif

}  // namespace ssc

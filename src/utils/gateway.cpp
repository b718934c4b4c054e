// The system's default gateway through the platform's gateway functions.
#include "vornwireless/utils/gateway.h"

#include "vornplatform/err.h"
#include "vornplatform/gateway.h"
#include "vornplatform/log.h"
#include "vornplatform/log_event.h"

namespace vornwireless {
namespace utils {

namespace {
const int kGatewayBufferSize = 20;
}  // namespace

Gateway::Gateway() {}

int Gateway::Get(IPAddress& gateway) const {
  char buffer[kGatewayBufferSize] = "";
  if (VORNNetDefaultGatewayGet(buffer, kGatewayBufferSize) < 0) {
    VORN_LOG(LOG_ERR, "get gateway failed [0x%04X %s:%d]", VLIBCErrGet(), VLIBCErrGetFile(),
             VLIBCErrGetLine());
    return -1;
  }
  gateway = std::string(buffer);
  return 0;
}

int Gateway::GetConfig(IPAddress& gateway) const {
  char buffer[kGatewayBufferSize] = "";
  if (VORNNetDefaultGatewayGetConf(buffer, kGatewayBufferSize) < 0) {
    VORN_LOG(LOG_ERR, "get gateway config failed [0x%04X %s:%d]", VLIBCErrGet(), VLIBCErrGetFile(),
             VLIBCErrGetLine());
    return -1;
  }
  gateway = std::string(buffer);
  return 0;
}

int Gateway::Set(IPAddress const& gateway) {
  IPAddress current;
  IPAddress config;
  if (Get(current) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get gateway");
    return -1;
  }
  if (GetConfig(config) < 0) {
    VORN_LOG(LOG_ERR, "Failed to get gateway conf");
    return -1;
  }
  if (gateway == current && gateway == config) return 0;

  if (VORNNetDefaultGatewaySetConf(gateway.ToCString()) < 0) {
    VORN_LOG(LOG_ERR, "set gateway conf failed");
    return -1;
  }
  if (VORNNetDefaultGatewaySet(gateway.ToCString()) < 0) {
    VORN_LOG(LOG_ERR, "set gateway failed");
    return -1;
  }
  _gateway = gateway;

  // An empty config with a new gateway reports a change.
  if (config.IsEmpty() && gateway.IsEmpty()) {
    VORNLogSet1(2, 1, 0x1180130f, gateway.ToCString(), "", "", "");
  } else if (gateway.IsEmpty()) {
    VORNLogSet1(2, 1, 0x11801310, config.ToCString(), "", "", "");
  } else {
    VORNLogSet1(2, 1, 0x11801311, config.ToCString(), gateway.ToCString(), "", "");
  }
  return 0;
}

int Gateway::Backup() {
  if (Get(_backup) < 0) return -1;
  if (_backup.IsEmpty() && GetConfig(_backup) < 0) return -1;
  if (_backup.IsEmpty()) {
    VORN_LOG(LOG_ERR, "Failed to backup gateway");
    return -1;
  }
  return 0;
}

void Gateway::Restore() {
  if (!_backup.IsEmpty()) Set(_backup);
}

}  // namespace utils
}  // namespace vornwireless

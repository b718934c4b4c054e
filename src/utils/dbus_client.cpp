#include "vornwireless/utils/dbus_client.h"

#include <json/json.h>

#include "vornplatform/log.h"
#include "vornwireless/dbus_net/net_client.h"

namespace vornwireless {
namespace utils {

using vornnetwork::dbus::NetClient;

int GetGatewayPriority(std::string const& ifname, std::string const& type) {
  Json::Value request(Json::objectValue);
  request["type"] = type;
  request["ifname"] = ifname;
  Json::Value response;
  NetClient client;
  if (client.GetGatewayDataByInterface(request, response) < 0) {
    VORN_LOG(LOG_ERR, "Failed to GetGatewayDataByInterface [%s]", ifname.c_str());
    return -1;
  }
  // The answer comes from another process: a member of the wrong type is a failure, not a crash.
  if (!response.isObject() || !response["priority"].isInt()) {
    VORN_LOG(LOG_ERR, "Failed to GetGatewayDataByInterface [%s]", ifname.c_str());
    return -1;
  }
  return response["priority"].asInt();
}

bool SetGatewayInfo(std::string const& ifname, std::string const& type, std::string const& gateway,
                    std::string const& dns, std::string const& cls, int priority, bool) {
  Json::Value request(Json::objectValue);
  request["type"] = type;
  request["priority"] = priority;
  request["ifname"] = ifname;
  request["gateway"] = gateway;
  request["dns"] = dns;
  request["class"] = cls;
  NetClient client;
  if (client.AddGatewayData(request) < 0) {
    VORN_LOG(LOG_ERR, "Failed to AddGatewayData on [%s]", ifname.c_str());
    return false;
  }
  return true;
}

bool DelGatewayInfo(std::string const& ifname, std::string const& type, bool) {
  Json::Value request(Json::objectValue);
  request["type"] = type;
  request["ifname"] = ifname;
  NetClient client;
  if (client.DelGatewayData(request) < 0) {
    VORN_LOG(LOG_ERR, "Failed to DelGatewayData on [%s]", ifname.c_str());
    return false;
  }
  return true;
}

bool RefreshGateway(std::string const& type) {
  Json::Value request(Json::objectValue);
  request["type"] = type;
  NetClient client;
  if (client.RefreshGateway(request) < 0) {
    VORN_LOG(LOG_ERR, "Failed to refresh gateway of type [%s]", type.c_str());
    return false;
  }
  return true;
}

}  // namespace utils
}  // namespace vornwireless

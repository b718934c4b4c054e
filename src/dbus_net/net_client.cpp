#include "vornwireless/dbus_net/net_client.h"

#include "vornplatform/log.h"
#include "vornplatform/proc.h"

// jsoncpp marks Json::Reader and Json::FastWriter deprecated; they give the texts our peers expect.
#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornnetwork {
namespace dbus {

namespace {

const char kService[] = "com.vornlink.net";
const char kPath[] = "/";

std::string Compact(Json::Value const& value) {
  Json::FastWriter writer;
  return writer.write(value);
}

}  // namespace

const char NetClient::kPidFile[] = "/var/run/vornnetd.pid";

NetClient::NetClient()
    : vornnetsdk::dbus::DBusClient(kService, kPath, kService, vornnetsdk::dbus::DBUS_BUS_SESSION) {}

NetClient::~NetClient() = default;

bool NetClient::IsServerReady() const {
  if (VLIBCProcAliveByPidFile(kPidFile) == 0) return false;
  return vornnetsdk::dbus::DBusClient::IsServerReady();
}

int NetClient::Call(const char* method, std::string const& text) {
  if (NewMessage(method) < 0) return -1;
  if (Append(text.c_str()) < 0) return -1;
  if (SendMessage(true, -1) < 0) return -1;
  return 0;
}

int NetClient::Query(const char* method, std::string const& text, Json::Value& result,
                     const char* parseFailure) {
  if (Call(method, text) < 0) return -1;
  std::string reply;
  if (GetReply(reply) < 0) return -1;
  Json::Reader reader;
  Json::Value parsed;
  if (!reader.parse(reply, parsed)) {
    VORN_LOG(LOG_ERR, "%s", parseFailure);
    return -1;
  }
  result.swap(parsed);
  return 0;
}

int NetClient::RefreshGateway(Json::Value& request) {
  return Call("RefreshGateway", request.toStyledString());
}

int NetClient::ResetIPv6Module(std::string const& ifname) {
  return Call("ResetIPv6Module", ifname);
}

int NetClient::GetDeviceListData(std::string const& scannerType, Json::Value& result) {
  return Query("GetDeviceListData", scannerType, result, "Failed to parse upnp data");
}

int NetClient::SetDeviceListData(Json::Value const& data) {
  return Call("SetDeviceListData", Compact(data));
}

int NetClient::DelDeviceListData(std::string const& mac) { return Call("DelDeviceListData", mac); }

int NetClient::GetGatewayListData(Json::Value& request, Json::Value& result) {
  return Query("GetGatewayListData", Compact(request), result, "Failed to get gateway list data");
}

int NetClient::AddGatewayData(Json::Value& request) {
  return Call("AddGatewayData", Compact(request));
}

int NetClient::DelGatewayData(Json::Value& request) {
  return Call("DelGatewayData", Compact(request));
}

int NetClient::SetSlaveData(Json::Value& request) { return Call("SetSlaveData", Compact(request)); }

int NetClient::CopyGatewayData(Json::Value& request) {
  return Call("CopyGatewayData", Compact(request));
}

int NetClient::GetGatewayDataByInterface(Json::Value& request, Json::Value& result) {
  return Query("GetGatewayDataByInterface", Compact(request), result,
               "Failed to parse gateway data by interface");
}

}  // namespace dbus
}  // namespace vornnetwork

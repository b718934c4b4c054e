#include "recording_agent.h"

#include <pthread.h>

#include <algorithm>

#include "vornwireless/wifi/adapter.h"

namespace vorntest {

using vornwireless::wifi::AdapterAgent;
using vornwireless::wifi::AdapterConfig;

std::map<std::string, int> RecordingAgent::results;
vornwireless::wifi::WIFI_STATUS RecordingAgent::status = vornwireless::wifi::WIFI_STATUS_DISABLED;
std::vector<AgentCall> RecordingAgent::calls;
int RecordingAgent::made = 0;
std::vector<std::string> RecordingAgent::refused;

AdapterAgent* RecordingAgent::Make(const AdapterConfig& config) {
  if (std::find(refused.begin(), refused.end(), config.interface) != refused.end()) {
    return nullptr;
  }
  ++made;
  return new RecordingAgent();
}

void RecordingAgent::Reset() {
  results.clear();
  status = vornwireless::wifi::WIFI_STATUS_DISABLED;
  calls.clear();
  made = 0;
  refused.clear();
}

std::vector<AgentCall> RecordingAgent::CallsOf(const std::string& op) {
  std::vector<AgentCall> out;
  for (const AgentCall& c : calls) {
    if (c.op == op) out.push_back(c);
  }
  return out;
}

int RecordingAgent::Note(const std::string& op, const AdapterConfig& c,
                         vornwireless::wifi::RELOAD_STATUS s) {
  bool held = false;
  if (pthread_mutex_trylock(&vornwireless::wifi::Adapter::_wifiMutex) == 0) {
    pthread_mutex_unlock(&vornwireless::wifi::Adapter::_wifiMutex);
  } else {
    held = true;
  }
  calls.push_back(AgentCall{ifname, op, c, s, held});
  auto it = results.find(op);
  return it == results.end() ? 0 : it->second;
}

}  // namespace vorntest

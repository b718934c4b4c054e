// The agent factory and the common part of every agent.
#include "vornwireless/wifi/adapter_agent.h"

#include <atomic>

namespace vornwireless {
namespace wifi {

namespace {
std::atomic<AdapterAgent::Maker> maker{nullptr};
}

AdapterAgent* AdapterAgent::Create(const AdapterConfig& config) {
  // The agent kinds by driver, radio and topology are not part of the library yet; without a
  // registered maker there is no agent for any adapter.
  Maker m = maker.load();
  if (m == nullptr) return nullptr;
  AdapterAgent* agent = m(config);
  if (agent != nullptr) agent->ifname = config.interface;
  return agent;
}

void AdapterAgent::Delete(const AdapterAgent* agent) { delete agent; }

AdapterAgent::Maker AdapterAgent::SetMaker(Maker m) { return maker.exchange(m); }

bool AdapterAgent::SetCountryCodeImpl(const std::string&) const { return true; }

AdapterAgent::~AdapterAgent() {}

}  // namespace wifi
}  // namespace vornwireless

// Modules for the manager's tests: each records its calls and returns what the test asks.
#ifndef VORN_TESTS_UNIT_NETWORK_FAKE_MODULES_H
#define VORN_TESTS_UNIT_NETWORK_FAKE_MODULES_H

#include <map>
#include <string>
#include <vector>

#include "vornwireless/network/base_module.h"
#include "vornwireless/network/event/base_event.h"
#include "vornwireless/network/module_manager.h"

namespace vorntest {

using vornnetwork::network::event::BaseEvent;
using vornnetwork::network::module::BaseModule;
using vornnetwork::network::module::MODULE_TYPE;

// What one fake module type does, and what happened to it.
struct FakeBehaviour {
  int hookResult = 0;
  int initResult = 0;
  int startResult = 0;
  int terminateResult = 0;
  int requestResult = 0;
  int eventResult = 0;
  bool hookHello = false;  // HookEvents hooks OnEvent to the hello event
  int created = 0;
  int destroyed = 0;
  int inits = 0;
  int starts = 0;
  int terminates = 0;
  int requests = 0;
  int events = 0;
};

// Per type; reset by ResetFakes.
std::map<int, FakeBehaviour>& Fakes();
void ResetFakes();
// Every call to OnEvent, in order, as the module type.
std::vector<int>& EventLog();
// "create:5", "init:2", "start:2", "terminate:3", "delete:3" in call order.
std::vector<std::string>& CallLog();

class FakeModule : public BaseModule {
 public:
  explicit FakeModule(MODULE_TYPE type);
  ~FakeModule() override;
  int ProcessRequest(Json::Value const& request, Json::Value& response) override;
  int InitialModule() override;
  int TerminateModule() override;
  int StartModule() override;
  int HookEvents() const override;
  virtual int OnEvent(BaseEvent const* event);
};

template <MODULE_TYPE type>
BaseModule* CreateFake() {
  return new FakeModule(type);
}

// Removes every module 1..5 from the singleton and unhooks them from every event.
void ClearManager();

}  // namespace vorntest

#endif

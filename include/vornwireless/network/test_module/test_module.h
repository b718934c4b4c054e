// The framework's sample module (type 1); disabled in the daemon's table.
#ifndef VORNWIRELESS_NETWORK_TEST_MODULE_TEST_MODULE_H
#define VORNWIRELESS_NETWORK_TEST_MODULE_TEST_MODULE_H

#include "vornwireless/network/base_module.h"

namespace vornnetwork {
namespace network {
namespace module {

class TestModule : public BaseModule {
 public:
  TestModule();
  ~TestModule() override;

  static BaseModule* Create();

  int ProcessRequest(Json::Value const& request, Json::Value& response) override;
  int InitialModule() override;
  int TerminateModule() override;
  int StartModule() override;
  int HookEvents() const override;  // hooks OnHelloEvent to the hello event

  int OnHelloEvent(event::BaseEvent const* event);
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif

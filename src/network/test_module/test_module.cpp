// The sample module: logs its life cycle and answers the hello event.
#include "vornwireless/network/test_module/test_module.h"

#include "vornplatform/log.h"
#include "vornwireless/network/event/base_event.h"

namespace vornnetwork {
namespace network {
namespace module {

TestModule::TestModule() : BaseModule(MODULE_TEST) {
  VORN_LOG(LOG_INFO, "Constructor of Test Module");
}

TestModule::~TestModule() { VORN_LOG(LOG_INFO, "Destructor of Test Module"); }

BaseModule* TestModule::Create() { return new TestModule(); }

int TestModule::ProcessRequest(Json::Value const& /*request*/, Json::Value& /*response*/) {
  VORN_LOG(LOG_INFO, "ProcessRequest of Test Module");
  return 0;
}

int TestModule::InitialModule() {
  VORN_LOG(LOG_INFO, "Initial Test Module");
  return 0;
}

int TestModule::TerminateModule() {
  VORN_LOG(LOG_INFO, "Terminate Test Module");
  return 0;
}

int TestModule::StartModule() {
  VORN_LOG(LOG_INFO, "Start Test Module");
  return 0;
}

int TestModule::HookEvents() const {
  if (HookEvent(event::EVENT_HELLO, static_cast<EVENT_HANDLER>(&TestModule::OnHelloEvent)) != 0) {
    VORN_LOG(LOG_ERR, "Failed to hook hello event by test module");
    return -1;
  }
  VORN_LOG(LOG_INFO, "Success to hook hello event by test module");
  return 0;
}

int TestModule::OnHelloEvent(event::BaseEvent const* event) {
  if (event == nullptr) {
    VORN_LOG(LOG_ERR, "Null event pointer");
    return -1;
  }
  VORN_LOG(LOG_INFO, "TestModule process hello event [%s]", event->ToStr().c_str());
  return 0;
}

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

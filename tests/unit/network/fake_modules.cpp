#include "fake_modules.h"

namespace vorntest {

using vornnetwork::network::module::ModuleManager;
namespace ev = vornnetwork::network::event;

std::map<int, FakeBehaviour>& Fakes() {
  static std::map<int, FakeBehaviour> fakes;
  return fakes;
}

void ResetFakes() {
  Fakes().clear();
  EventLog().clear();
  CallLog().clear();
}

std::vector<std::string>& CallLog() {
  static std::vector<std::string> log;
  return log;
}

namespace {
void Note(char const* what, int type) { CallLog().push_back(what + std::string(":") + std::to_string(type)); }
}  // namespace

std::vector<int>& EventLog() {
  static std::vector<int> log;
  return log;
}

FakeModule::FakeModule(MODULE_TYPE type) : BaseModule(type) {
  ++Fakes()[type].created;
  Note("create", type);
}

FakeModule::~FakeModule() {
  ++Fakes()[_type].destroyed;
  Note("delete", _type);
}

int FakeModule::ProcessRequest(Json::Value const& request, Json::Value& response) {
  ++Fakes()[_type].requests;
  response["echo"] = request;
  response["module"] = static_cast<int>(_type);
  return Fakes()[_type].requestResult;
}

int FakeModule::InitialModule() {
  ++Fakes()[_type].inits;
  Note("init", _type);
  return Fakes()[_type].initResult;
}

int FakeModule::TerminateModule() {
  ++Fakes()[_type].terminates;
  Note("terminate", _type);
  return Fakes()[_type].terminateResult;
}

int FakeModule::StartModule() {
  ++Fakes()[_type].starts;
  Note("start", _type);
  return Fakes()[_type].startResult;
}

int FakeModule::HookEvents() const {
  FakeBehaviour const& b = Fakes()[_type];
  if (b.hookResult != 0) return b.hookResult;
  if (b.hookHello) {
    return HookEvent(ev::EVENT_HELLO,
                     static_cast<vornnetwork::network::module::EVENT_HANDLER>(&FakeModule::OnEvent));
  }
  return 0;
}

int FakeModule::OnEvent(BaseEvent const* /*event*/) {
  ++Fakes()[_type].events;
  EventLog().push_back(_type);
  return Fakes()[_type].eventResult;
}

void ClearManager() {
  ModuleManager& manager = ModuleManager::GetInstance();
  for (int t = 1; t <= 5; ++t) {
    manager.RemoveModule(static_cast<MODULE_TYPE>(t));
    manager.UnHookEvent(ev::EVENT_HELLO, static_cast<MODULE_TYPE>(t));
    manager.UnHookEvent(ev::EVENT_VALID, static_cast<MODULE_TYPE>(t));
  }
}

}  // namespace vorntest

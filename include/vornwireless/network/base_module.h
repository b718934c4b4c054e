// The base of every module of the network daemon: a type, a three-state life cycle
// (1 created/terminated, 2 initialised, 3 started) and JSON requests.
#ifndef VORNWIRELESS_NETWORK_BASE_MODULE_H
#define VORNWIRELESS_NETWORK_BASE_MODULE_H

#include <json/json.h>

#include <string>

#include "vornwireless/network/event/event_type.h"
#include "vornwireless/network/module_type.h"
#include "vornwireless/network/pthread_mutex.h"

namespace vornnetwork {
namespace network {
namespace event {
class BaseEvent;
}  // namespace event

namespace module {

class BaseModule;

// A module's event handler: a member function of the module (it may be virtual).
typedef int (BaseModule::*EVENT_HANDLER)(event::BaseEvent const*);

enum MODULE_STATE {
  MODULE_STATE_CREATED = 1,  // created or terminated
  MODULE_STATE_INITIALIZED = 2,
  MODULE_STATE_STARTED = 3,
};

class BaseModule {
 public:
  explicit BaseModule(MODULE_TYPE type);
  virtual ~BaseModule();
  BaseModule(BaseModule const&) = delete;
  BaseModule& operator=(BaseModule const&) = delete;

  // Answers one JSON request; the base version returns 0 and touches nothing.
  virtual int ProcessRequest(Json::Value const& request, Json::Value& response);
  // "module:" and the type number.
  virtual std::string ToStr() const;
  virtual int InitialModule() = 0;
  virtual int TerminateModule() = 0;
  virtual int StartModule() = 0;
  // Hooks the module's event handlers; the base version hooks nothing and returns 0.
  virtual int HookEvents() const;

  // 0 when initialised (or already so); else the failing step's value after Terminate.
  int Initialize();
  // Only from state 2; -1 when not initialised, else StartModule's value.
  int Start();
  // TerminateModule's value; 0 brings the state back to 1.
  int Terminate();

  bool Lock();
  bool Unlock();
  bool Trylock();

  // Through the manager, for this module's own type: 0 or non-zero.
  int HookEvent(event::EVENT_TYPE type, EVENT_HANDLER handler) const;
  int UnHookEvent(event::EVENT_TYPE type) const;

  // True for the types 1 to 5.
  static bool IsValidModule(int type);

  int GetState() const { return _state; }
  MODULE_TYPE GetType() const { return _type; }

 protected:
  int _state;
  MODULE_TYPE _type;
  PthreadMutex _mutex;
};

}  // namespace module
}  // namespace network
}  // namespace vornnetwork

#endif

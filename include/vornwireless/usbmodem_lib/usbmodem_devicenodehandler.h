// The serial nodes of one dongle. Of the nodes named in its information file, those that answer
// the probe command are divided into a query node (kept open for AT commands) and a connect node
// (handed to the dialler). A one-port dongle lends its only node to the dialler while a dial-up
// runs and gets it back afterwards; in between every command answers with an empty reply.
//
// SendCommand and GetConnectNode are exclusive per modem across processes through a System V
// semaphore keyed by the modem id.
#ifndef VORNWIRELESS_USBMODEM_LIB_USBMODEM_DEVICENODEHANDLER_H
#define VORNWIRELESS_USBMODEM_LIB_USBMODEM_DEVICENODEHANDLER_H

#include <string>
#include <vector>

#include "vornwireless/semaphore/semaphore.h"

class WvModem;

namespace vornwireless {
namespace usbmodem_lib {

class USBModem_DeviceNodeHandler {
 public:
  explicit USBModem_DeviceNodeHandler(unsigned int ifid);
  virtual ~USBModem_DeviceNodeHandler();

  // The open device and the node lists belong to one object; it is neither copied nor assigned.
  USBModem_DeviceNodeHandler(USBModem_DeviceNodeHandler const&) = delete;
  USBModem_DeviceNodeHandler& operator=(USBModem_DeviceNodeHandler const&) = delete;

  // Reads the nodes of `infoPath`, keeps those answering `queryCommand`; a dongle with two or
  // more answering nodes gets its connect and query nodes now. 0 or -1.
  int InitHandler(std::string const& infoPath, std::string const& queryCommand);
  // Sends one command (a carriage return is added) and gives the filtered reply: echo and blank
  // lines dropped, every line ended by a line feed. An empty reply with 0 means that no node is
  // free (a one-port dongle lent to the dialler). A command holding a line feed, a carriage
  // return or another control character is refused. 0 or -1.
  int SendCommand(std::string const& cmd, std::string& reply);
  // Always 0; `node` is the full path of the node the dialler may open (unchanged when none).
  // On a one-port dongle this closes the query node and waits 10 seconds.
  int GetConnectNode(std::string& node);
  // A one-port dongle takes its node back from the dialler and waits 5 seconds.
  void ReleaseConnectNode();

 private:
  int InitDeviceNodeList();
  int TestNode(std::string const& node, std::string& reply);
  int GetModemCmdRetryTimes(int& times);
  int AssignQuaryNode();
  int AssignConnectNode();
  int OpenFileDevice(std::string const& node);
  void CloseFileDevice();
  void CloseDeviceAndQueryNode();
  int DrainDeviceBuffer();
  int ModemCmd(std::string const& cmd, std::string& reply);

  vornwireless::semaphore::Semaphore _semaphore;
  WvModem* _modem;
  std::vector<std::string> _nodes;
  bool _multiNode;
  std::string _prefix;
  std::string _queryCommand;
  std::string _infoPath;
  std::string _connectNode;
  std::string _queryNode;

  friend class USBModem_DeviceNodeHandlerTestPeer;
};

}  // namespace usbmodem_lib
}  // namespace vornwireless

#endif

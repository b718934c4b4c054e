#include "vornwireless/usbmodem_lib/usbmodem_devicenodehandler.h"

#include <unistd.h>
#include <wvmodem.h>

#include <algorithm>
#include <cctype>
#include <cstring>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornwireless/usbmodem_lib/usbmodem_secret_mask.h"

namespace vornwireless {
namespace usbmodem_lib {

namespace {

const int kKeyBufferSize = 1024;
const int kReplyBufferSize = 1024;
const time_t kDrainTimeoutMs = 100;
const time_t kReplyTimeoutMs = 1000;
const time_t kReplyTailTimeoutMs = 200;
const unsigned int kConnectNodeSettleSeconds = 10;
const unsigned int kReleaseNodeSettleSeconds = 5;
// A drain that keeps finding data this many times in a row is given up: a node that talks
// without end would otherwise hold the caller for ever.
const int kMaxDrainRounds = 100;

// Reads one key of the information file; true when found with a value.
bool ReadInfoKey(std::string const& path, const char* key, std::string& value) {
  char buffer[kKeyBufferSize];
  memset(buffer, 0, sizeof(buffer));
  if (VLIBCFileGetKeyValue(path.c_str(), key, buffer, sizeof(buffer), 0) <= 0) return false;
  value = buffer;
  return true;
}

// A command line may hold no line break or other control character: it would end the command
// early and start another one.
bool IsSingleCommandLine(std::string const& cmd) {
  for (char c : cmd) {
    unsigned char u = static_cast<unsigned char>(c);
    if (u < 0x20 || u == 0x7f) return false;
  }
  return true;
}

}  // namespace

USBModem_DeviceNodeHandler::USBModem_DeviceNodeHandler(unsigned int ifid)
    : _semaphore(ifid), _modem(nullptr), _multiNode(false) {}

USBModem_DeviceNodeHandler::~USBModem_DeviceNodeHandler() { CloseDeviceAndQueryNode(); }

int USBModem_DeviceNodeHandler::InitHandler(std::string const& infoPath,
                                            std::string const& queryCommand) {
  if (VLIBCFileExist(infoPath.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "failed to setup device node, usbmodem info not exist (%s)",
             infoPath.c_str());
    return -1;
  }
  _infoPath = infoPath;
  if (queryCommand.empty()) {
    VORN_LOG(LOG_ERR, "failed to setup device node, query command is empty");
    return -1;
  }
  _queryCommand = queryCommand;
  if (InitDeviceNodeList() != 0) {
    VORN_LOG(LOG_ERR, "failed to list device nodes");
    return -1;
  }
  _multiNode = _nodes.size() >= 2;
  if (!_multiNode) return 0;  // a one-port dongle assigns its node when it is needed
  if (AssignConnectNode() != 0) {
    VORN_LOG(LOG_ERR, "failed to init connect node for multi-node device");
    return -1;
  }
  if (AssignQuaryNode() != 0) {
    VORN_LOG(LOG_ERR, "failed to init query node for multi-node device");
    return -1;
  }
  return 0;
}

int USBModem_DeviceNodeHandler::InitDeviceNodeList() {
  std::string prefix;
  if (!ReadInfoKey(_infoPath, "DEVICENODE_PREFIX", prefix)) {
    VORN_LOG(LOG_ERR, "Cannot find DEVICENODE_PREFIX in file [%s]", _infoPath.c_str());
    return -1;
  }
  _prefix = prefix;
  _nodes.clear();

  // The hot-plug side may still be writing the file: ask again, right away.
  std::string value;
  for (int attempt = 1; attempt <= 3; ++attempt) {
    if (ReadInfoKey(_infoPath, "DEVICENODE", value)) break;
    VORN_LOG(LOG_ERR, "No respond on setting device node list, wait 1 sec [%d]", attempt);
  }
  if (value.empty()) {
    VORN_LOG(LOG_ERR, "error on parsing DEVICENODE from %s", _infoPath.c_str());
    return -1;
  }

  std::string::size_type start = 0;
  while (start <= value.size()) {
    std::string::size_type comma = value.find(',', start);
    std::string name = value.substr(start, comma == std::string::npos ? std::string::npos
                                                                      : comma - start);
    start = (comma == std::string::npos) ? value.size() + 1 : comma + 1;
    if (name.empty()) continue;
    std::string node = _prefix + name;
    std::string reply;
    if (TestNode(node, reply) != 0) continue;  // a node that does not answer is not ours to use
    std::transform(reply.begin(), reply.end(), reply.begin(),
                   [](unsigned char c) { return static_cast<char>(toupper(c)); });
    if (reply.find("BUSY") != std::string::npos) {
      VORN_LOG(LOG_ERR, "Busy detected when testing node (%s), delay the init", node.c_str());
      _nodes.clear();
      return -1;
    }
    _nodes.push_back(node);
  }
  return 0;
}

int USBModem_DeviceNodeHandler::TestNode(std::string const& node, std::string& reply) {
  if (node.empty()) {
    VORN_LOG(LOG_ERR, "test node input should not be empty");
    return -1;
  }
  if (OpenFileDevice(node) != 0) return -1;
  int times = 0;
  if (GetModemCmdRetryTimes(times) != 0) {
    VORN_LOG(LOG_ERR, "Failed to get modem cmd trying attemps.");
    CloseFileDevice();
    return -1;
  }
  int result = -1;
  for (int i = 0; i < times; ++i) {
    int ret = ModemCmd(_queryCommand, reply);
    if (ret == -2) {
      VORN_LOG(LOG_INFO, "Do workround that retries modem command for the buggy 3G-LTE dongle.");
      continue;
    }
    result = (ret == 0) ? 0 : -1;
    break;
  }
  CloseFileDevice();
  return result;
}

int USBModem_DeviceNodeHandler::GetModemCmdRetryTimes(int& times) {
  std::string vendor;
  std::string product;
  if (!ReadInfoKey(_infoPath, "USB_VENDOR", vendor)) {
    VORN_LOG(LOG_ERR, "Failed to get USB_VENDOR from file %s.", _infoPath.c_str());
    return -1;
  }
  if (!ReadInfoKey(_infoPath, "USB_PRODUCT", product)) {
    VORN_LOG(LOG_ERR, "Failed to get USB_PRODUCT from file %s.", _infoPath.c_str());
    return -1;
  }
  // One dongle answers its first command with an unterminated line: it gets three tries.
  times = (vendor.compare(0, 4, "12d1") == 0 && product.compare(0, 4, "1506") == 0) ? 3 : 1;
  return 0;
}

int USBModem_DeviceNodeHandler::AssignQuaryNode() {
  _queryNode.clear();
  if (_nodes.empty()) {
    VORN_LOG(LOG_ERR, "cannot find any device for quary node");
    return -1;
  }
  for (std::vector<std::string>::iterator it = _nodes.begin(); it != _nodes.end(); ++it) {
    if (OpenFileDevice(*it) == 0) {
      _queryNode = *it;
      _nodes.erase(it);
      return 0;
    }
  }
  VORN_LOG(LOG_ERR, "failed to assign query node");
  return -1;
}

int USBModem_DeviceNodeHandler::AssignConnectNode() {
  // Every node is in exactly one place: a connect node given up here goes back to the free list
  // first (a one-port dongle asked twice finds its node there again).
  if (!_connectNode.empty()) _nodes.push_back(_connectNode);
  _connectNode.clear();
  std::string candidate;
  std::string name;
  if (ReadInfoKey(_infoPath, "CONNECTNODE", name)) {
    candidate = _prefix + name;
  } else if (!_nodes.empty()) {
    candidate = _nodes.front();
  } else {
    VORN_LOG(LOG_ERR, "Cannot get connection node");
    return -1;
  }
  std::vector<std::string>::iterator it = std::find(_nodes.begin(), _nodes.end(), candidate);
  if (it == _nodes.end()) {
    VORN_LOG(LOG_ERR, "Connection node is not in the list");
    return -1;
  }
  _nodes.erase(it);
  _connectNode = candidate;
  return 0;
}

int USBModem_DeviceNodeHandler::OpenFileDevice(std::string const& node) {
  if (_modem != nullptr) {
    VORN_LOG(LOG_ERR, "Open device warning: new a modem which is not null");
    CloseFileDevice();
  }
  _modem = new WvModem(node.c_str(), 9600, true, false);
  if (!_modem->isok()) {
    VORN_LOG(LOG_ERR, "modem Init failed: %s", _modem->errstr().cstr());
    CloseFileDevice();
    return -1;
  }
  return 0;
}

void USBModem_DeviceNodeHandler::CloseFileDevice() {
  if (_modem == nullptr) return;
  _modem->close();
  delete _modem;
  _modem = nullptr;
}

void USBModem_DeviceNodeHandler::CloseDeviceAndQueryNode() {
  if (!_queryNode.empty()) {
    _nodes.push_back(_queryNode);
    _queryNode.clear();
  }
  CloseFileDevice();
}

int USBModem_DeviceNodeHandler::DrainDeviceBuffer() {
  if (_modem == nullptr) {
    VORN_LOG(LOG_ERR, "Error when cleaning device buffer, modem is null");
    return -1;
  }
  _modem->write("\r\r\r\r\r", 5);
  for (int round = 0; round < kMaxDrainRounds && _modem->isok(); ++round) {
    if (!_modem->select(kDrainTimeoutMs, true, false)) break;
    _modem->drain();
  }
  return 0;
}

int USBModem_DeviceNodeHandler::ModemCmd(std::string const& cmd, std::string& reply) {
  if (_modem == nullptr || cmd.empty()) {
    VORN_LOG(LOG_ERR, "Error on executing modem cmd with a null modem or null command");
    return -1;
  }
  if (DrainDeviceBuffer() != 0) {
    VORN_LOG(LOG_ERR, "failed on drain buffer");
    return -1;
  }
  std::string line = cmd + "\r";
  _modem->write(line.data(), line.size());
  if (!_modem->isok() || !_modem->select(kReplyTimeoutMs, true, false)) {
    VORN_LOG(LOG_ERR, "No respond on modem cmd %s", MaskSecretsInCommand(cmd).c_str());
    return -1;
  }

  char buffer[kReplyBufferSize];
  size_t length = _modem->read(buffer, sizeof(buffer));
  while (length < sizeof(buffer) && _modem->isok() &&
         _modem->select(kReplyTailTimeoutMs, true, false)) {
    size_t more = _modem->read(buffer + length, sizeof(buffer) - length);
    if (more == 0) break;
    length += more;
  }
  if (length == 0) {
    // Readable without data: the line hung up (the dongle went away).
    VORN_LOG(LOG_ERR, "No respond on modem cmd %s", MaskSecretsInCommand(cmd).c_str());
    return -1;
  }
  std::string data(buffer, length);

  // The modem's lines, without the echo of the command and without blank lines, each ended by a
  // line feed.
  reply.clear();
  std::string::size_type start = 0;
  while (start < data.size()) {
    std::string::size_type lf = data.find('\n', start);
    std::string text = data.substr(start, lf == std::string::npos ? std::string::npos : lf - start);
    start = (lf == std::string::npos) ? data.size() : lf + 1;
    if (text.empty()) break;
    if (text.find(cmd) != std::string::npos) continue;
    if (text[0] == '\r') continue;
    std::string::size_type cr = text.find('\r');
    if (cr == std::string::npos) return -2;  // cut off before its end
    text[cr] = '\n';
    reply += text;
  }
  return 0;
}

int USBModem_DeviceNodeHandler::SendCommand(std::string const& cmd, std::string& reply) {
  if (!IsSingleCommandLine(cmd)) {
    VORN_LOG(LOG_ERR, "Refuse modem cmd holding a control character");
    return -1;
  }
  if (_semaphore.Enter() != 0) {
    VORN_LOG(LOG_ERR, "Error on enter Semaphore");
    return -1;
  }
  int result = 0;
  if (_queryNode.empty() && _nodes.empty()) {
    // A one-port dongle lent to the dialler, or no node answered: the empty reply reads as mute.
    reply.clear();
  } else if (_queryNode.empty() && AssignQuaryNode() != 0) {
    VORN_LOG(LOG_ERR, "failed to setup query node");
    result = -1;
  } else if (ModemCmd(cmd, reply) != 0) {
    // The node goes back to the free ones, so that the next command may open any of them.
    CloseDeviceAndQueryNode();
    VORN_LOG(LOG_ERR, "failed to send modem cmd");
    result = -1;
  }
  if (_semaphore.Release() != 0) VORN_LOG(LOG_ERR, "Error on release Semaphore");
  return result;
}

int USBModem_DeviceNodeHandler::GetConnectNode(std::string& node) {
  if (_semaphore.Enter() != 0) VORN_LOG(LOG_ERR, "Error on enter Semaphore");
  int assigned = 0;
  if (!_multiNode || _connectNode.empty()) assigned = AssignConnectNode();
  if (assigned != 0 && _queryNode.empty()) {
    VORN_LOG(LOG_ERR, "failed on parsing connect device node");
  } else {
    if (assigned != 0) {
      // The only answering node is the open query node: hand it over to the dialler and let the
      // port settle before the dialler opens it.
      _connectNode = _queryNode;
      CloseFileDevice();
      _queryNode.clear();
      sleep(kConnectNodeSettleSeconds);
    }
    node = _connectNode;
  }
  if (_semaphore.Release() != 0) VORN_LOG(LOG_ERR, "Error on release Semaphore");
  return 0;
}

void USBModem_DeviceNodeHandler::ReleaseConnectNode() {
  if (_multiNode || _connectNode.empty()) return;  // a multi-node dongle keeps its connect node
  _nodes.push_back(_connectNode);
  _connectNode.clear();
  sleep(kReleaseNodeSettleSeconds);
}

}  // namespace usbmodem_lib
}  // namespace vornwireless

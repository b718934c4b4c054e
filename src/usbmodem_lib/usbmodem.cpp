// A plugged dongle: identity, initialisation, the JSON it reports, and its dial-up through
// wvdial, whose log is the only account of what the dial did.
#include "vornwireless/usbmodem_lib/usbmodem.h"

#include <fcntl.h>
#include <glib.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <fstream>
#include <sstream>
#include <utility>

#include "vornplatform/vlibc.h"
#include "vornplatform/action.h"
#include "vornplatform/kmod.h"
#include "vornplatform/log.h"
#include "vornplatform/netif.h"

namespace vornwireless {
namespace usbmodem_lib {

namespace {

const char kWvdialPath[] = "/usr/bin/wvdial";
const char kPeersFile[] = "/etc/ppp/peers/wvdial";
const char kPidFilePrefix[] = "/tmp/usbmodem.pid.";
const char kWvdialLogPrefix[] = "/var/lib/usbmodem/wvdial.log.";
// How long Disconnect waits for a stopped dialler to let go of its node (it hangs up the line
// and stops pppd first), in steps of kDiallerEndStepMs.
const int kDiallerEndWaitMs = 15000;
const int kDiallerEndStepMs = 100;

// Waits until pid has ended (a zombie counts as ended), at most kDiallerEndWaitMs. True when it
// has.
bool WaitForDiallerEnd(pid_t pid) {
  if (pid <= 0) return true;
  for (int waited = 0; waited < kDiallerEndWaitMs; waited += kDiallerEndStepMs) {
    if (VLIBCProcAlive(pid) != 1) return true;
    usleep(kDiallerEndStepMs * 1000);
  }
  return VLIBCProcAlive(pid) != 1;
}

// A profile value as text: strings as they are, booleans as "true"/"false", anything else empty.
std::string ProfileText(Json::Value const& profile, const char* key) {
  if (!profile.isObject() || !profile.isMember(key)) return std::string();
  Json::Value const& v = profile[key];
  if (v.isString()) return v.asString();
  if (v.isBool()) return v.asBool() ? "true" : "false";
  return std::string();
}

// Text that may go on a command line of the dialler: printable, no line breaks.
bool IsPlainText(std::string const& text) {
  for (unsigned char c : text) {
    if (c < 0x20 || c == 0x7f) return false;
  }
  return true;
}

// A dial number travels to the modem inside ATD: no quote either.
bool IsDialableNumber(std::string const& text) {
  return IsPlainText(text) && text.find('"') == std::string::npos;
}

void ReapChild(GPid, gint, gpointer) {}

}  // namespace

USBModem::USBModem(unsigned int ifid, std::string const& infoPath)
    : _ifid(ifid),
      _infoState(INFO_NOT_INITED),
      _netStatus(NET_DISCONNECTED),
      _infoPath(infoPath),
      _dialFailCount(0),
      _dialAttempts(0),
      _busy(false),
      _newPlugIn(true),
      _errorCount(0) {}

USBModem::USBModem(USBModem const& other)
    : _ifid(other._ifid),
      _infoState(other._infoState),
      _netStatus(other._netStatus),
      _infoPath(other._infoPath),
      _dialFailCount(other._dialFailCount),
      _dialAttempts(other._dialAttempts),
      _busy(other._busy),
      _newPlugIn(other._newPlugIn),
      _errorCount(other._errorCount),
      _simHandler(other._simHandler) {}

USBModem& USBModem::operator=(USBModem const& other) {
  if (this == &other) return *this;
  _ifid = other._ifid;
  _infoState = other._infoState;
  _netStatus = other._netStatus;
  _infoPath = other._infoPath;
  _pidFile = other._pidFile;
  _dialFailCount = other._dialFailCount;
  _dialAttempts = other._dialAttempts;
  _ifName = other._ifName;
  _localIP = other._localIP;
  _localMask = other._localMask;
  _busy = other._busy;
  _newPlugIn = other._newPlugIn;
  _errorCount = other._errorCount;
  _simHandler = other._simHandler;
  return *this;
}

USBModem::USBModem(USBModem&& other) noexcept
    : _ifid(other._ifid),
      _infoState(other._infoState),
      _netStatus(other._netStatus),
      _infoPath(std::move(other._infoPath)),
      _pidFile(std::move(other._pidFile)),
      _dialFailCount(other._dialFailCount),
      _dialAttempts(other._dialAttempts),
      _ifName(std::move(other._ifName)),
      _localIP(std::move(other._localIP)),
      _localMask(std::move(other._localMask)),
      _busy(other._busy),
      _newPlugIn(other._newPlugIn),
      _errorCount(other._errorCount),
      _simHandler(other._simHandler) {}

// An erase moves the later modems down by assignment: the same as a copy assignment.
USBModem& USBModem::operator=(USBModem&& other) noexcept { return *this = other; }

USBModem::~USBModem() {}

std::string USBModem::GetDevId() const { return "usbmodem" + std::to_string(_ifid); }

bool USBModem::IsNull() const { return false; }

bool USBModem::IsInited() const { return _infoState == INFO_INITED; }

bool USBModem::IsInfoExist() const { return VLIBCFileExist(_infoPath.c_str()) == 1; }

int USBModem::InitInfo() {
  if (_simHandler.InitHandler(_ifid) == 0) {
    _infoState = INFO_INITED;
    return 0;
  }
  VORN_LOG(LOG_ERR, "failed on setup sim handler");
  _infoState = INFO_FAILED;
  return -1;
}

unsigned USBModem::GetIfid() const { return _ifid; }

bool USBModem::IsError() { return _errorCount > 5; }

void USBModem::IncreaseErrorCounter() { ++_errorCount; }

bool USBModem::IsNewPlugIn() { return _newPlugIn; }

std::string USBModem::GetPINStatus(bool& error) { return _simHandler.GetPINStatus(error); }

int USBModem::PINUnlock(std::string const& pin) { return _simHandler.PINUnlock(pin); }

int USBModem::PINSet(std::string const& oldPin, std::string const& newPin, bool protection) {
  return _simHandler.PINSet(oldPin, newPin, protection);
}

int USBModem::PINGetEnableProtection() { return _simHandler.PINGetEnableProtection(); }

int USBModem::PUKSet(std::string const& puk, std::string const& pin) {
  return _simHandler.PUKSet(puk, pin);
}

Json::Value USBModem::GetProfile(bool& error) { return _simHandler.GetProfile(error); }

Json::Value USBModem::GetSimInfo(bool& error) { return _simHandler.GetSimInfo(error); }

int USBModem::SetProfile(Json::Value const& value) { return _simHandler.SetProfile(value); }

Json::Value USBModem::GetUSBModemData(bool& error) {
  Json::Value data = _simHandler.GetUSBModemData(error);
  if (!data.isObject()) data = Json::Value(Json::objectValue);
  data["id"] = GetDevId();
  data["ifname"] = GetNetIFName(error);
  data["ip"] = GetNetLocalIP(error);
  data["mask"] = GetNetLocalMask(error);
  data["net_status"] = GetNetStatus(error);
  return data;
}

// ---------------------------------------------------------------------------------------------
// Link state

bool USBModem::IsWvdialUp() const {
  std::string pidFile = kPidFilePrefix + std::to_string(_ifid);
  return VLIBCFileExist(pidFile.c_str()) == 1 && VLIBCProcAliveByPidFile(pidFile.c_str()) == 1;
}

int USBModem::UpdateIP() {
  if (_ifName.empty()) return 0;
  VORN_NETIF_INFO info;
  std::memset(&info, 0, sizeof(info));
  int ret = VORNNetIFGetInfo(_ifName.c_str(), &info, nullptr);
  if (ret == 1) {
    _localIP = info.szIP;
    _localMask = info.szMask;
    return 0;
  }
  _localIP.clear();
  _localMask.clear();
  if (ret == 0) return 0;
  VORN_LOG(LOG_ERR, "error on updating ip for if %s", _ifName.c_str());
  return -1;
}

int USBModem::GetLinkStats() {
  if (!IsWvdialUp()) {
    _netStatus = _dialFailCount == 0 ? NET_DISCONNECTED : NET_CONNECTION_LOST;
    return 0;
  }
  if (UpdateIP() != 0) {
    VORN_LOG(LOG_ERR, "failed to update ip");
    return 0;
  }
  if (!_ifName.empty() && !_localIP.empty()) {
    _netStatus = NET_CONNECTED;
  } else if (_netStatus == NET_CONNECTED || _netStatus == NET_CONNECTING_LOST) {
    _netStatus = NET_CONNECTING_LOST;
  } else {
    _netStatus = NET_CONNECTING;
  }
  return 0;
}

int USBModem::UpdateNetStatus() {
  GetLinkStats();
  switch (_netStatus) {
    case NET_CONNECTED:
      _dialFailCount = 0;
      return 1;
    case NET_CONNECTING:
      if (AssignConnectInfo() == -1) {
        if (NetDisconnect() < 0) return -1;
      }
      return 2;
    default:
      return 1;
  }
}

std::string USBModem::GetNetStatus(bool& error) {
  switch (_netStatus) {
    case NET_CONNECTED:
      return "connected";
    case NET_CONNECTING_LOST:
    case NET_CONNECTING:
      return "connecting";
    case NET_DISCONNECTED:
      return "disconnected";
    case NET_CONNECTION_LOST:
      return "connection_lost";
    default:
      VORN_LOG(LOG_ERR, "unknown net status %d", _netStatus);
      error = true;
      return std::string();
  }
}

bool USBModem::IsNetDisconnected(bool& error) {
  // The state is derived again at every look: a dialler started since the last look counts.
  GetLinkStats();
  bool unknown = false;
  GetNetStatus(unknown);
  if (unknown) {
    error = true;
    return false;
  }
  return _netStatus == NET_DISCONNECTED || _netStatus == NET_CONNECTION_LOST;
}

std::string USBModem::GetNetIFName(bool&) {
  return _netStatus == NET_CONNECTED ? _ifName : std::string();
}

std::string USBModem::GetNetLocalIP(bool&) {
  return _netStatus == NET_CONNECTED ? _localIP : std::string();
}

std::string USBModem::GetNetLocalMask(bool&) {
  return _netStatus == NET_CONNECTED ? _localMask : std::string();
}

int USBModem::KeyCountInText(std::string const& text, std::string const& key) {
  if (key.empty()) return 0;
  int count = 0;
  for (std::string::size_type pos = text.find(key); pos != std::string::npos;
       pos = text.find(key, pos + 1)) {
    ++count;
  }
  return count;
}

std::string USBModem::WvdialLogPath(bool& error) {
  bool flag = false;
  std::string imsi = _simHandler.GetIMSI(flag);
  if (flag || imsi.empty()) {
    error = true;
    return std::string();
  }
  return kWvdialLogPrefix + imsi;
}

int USBModem::ReloadFirewall() {
  pid_t pid = VLIBCProcForkEx(VLIBC_FORK_DETACH);
  if (pid < 0) return -1;
  if (pid == 0) {
    if (VORNFwRuleHup() != 0) {
      VORN_LOG(LOG_ERR, "reload firewall rules failed [0x%04X %s:%d]", VLIBCErrGet(),
               VLIBCErrGetFile(), VLIBCErrGetLine());
    }
    if (VORNFwTcRuleHup() != 0) {
      VORN_LOG(LOG_ERR, "reload firewall tc rules failed [0x%04X %s:%d]", VLIBCErrGet(),
               VLIBCErrGetFile(), VLIBCErrGetLine());
    }
    _exit(0);
  }
  return 0;
}

int USBModem::AssignConnectInfo() {
  bool flag = false;
  std::string logFile = WvdialLogPath(flag);
  if (flag || VLIBCFileExist(logFile.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "Error on file %s, not exist", logFile.c_str());
    return -1;
  }
  std::ifstream in(logFile, std::ios::in | std::ios::binary);
  if (!in.is_open()) {
    VORN_LOG(LOG_ERR, "Error on file open: %s", logFile.c_str());
    return -1;
  }
  std::stringstream buffer;
  buffer << in.rdbuf();
  std::string text = buffer.str();
  if (text.empty()) return 2;

  int count = KeyCountInText(text, "Disconnecting");
  if (count >= static_cast<int>(_dialAttempts)) {
    VORN_LOG(LOG_ERR, "dial attempt (%d) reached, cancel the connection", count);
    return -1;
  }
  count = KeyCountInText(text, "NO CARRIER");
  if (count >= static_cast<int>(_dialAttempts)) {
    VORN_LOG(LOG_ERR, "found NO CARRIER (%d), cancel the connection", count);
    return -1;
  }
  if (text.find("DNS address") == std::string::npos) return 2;

  std::string::size_type pos = text.find("Using interface");
  if (pos == std::string::npos) return 2;
  std::istringstream words(text.substr(pos + std::strlen("Using interface")));
  std::string name;
  words >> name;
  if (name.empty()) return 2;
  _ifName = name;

  if (ReloadFirewall() != 0) {
    VORN_LOG(LOG_ERR, "Error to fork");
    return -1;
  }
  return 1;
}

// ---------------------------------------------------------------------------------------------
// Dial-up

int USBModem::SetDefaultRoute(std::string const& value) {
  if (value.empty()) {
    VORN_LOG(LOG_ERR, "error on input args, should not be zero size");
    return -1;
  }
  if (VLIBCFileRemoveLine(kPeersFile, "nodefaultroute") < 0) {
    VORN_LOG(LOG_ERR, "error on remove line nodefaultroute in /etc/ppp/peers/wvdial");
    return -1;
  }
  if (value != "true" && VLIBCFileAddLine(kPeersFile, 0, "nodefaultroute", 1) != 1) {
    VORN_LOG(LOG_ERR, "error on add line nodefaultroute to /etc/ppp/peers/wvdial");
    return -1;
  }
  return 0;
}

void USBModem::InsertPPPModules() {
  static const char* const kModules[] = {"slhc", "ppp_generic", "ppp_async"};
  PVLIBSZLIST list = VLIBCSzListAlloc(1);
  if (!list) {
    VORN_LOG(LOG_ERR, "List set failed");
    return;
  }
  for (const char* name : kModules) {
    if (VORNCheckModule(name) == 1) continue;
    if (VLIBCSzListClean(list) < 0) {
      VORN_LOG(LOG_ERR, "List set failed");
      break;
    }
    std::string file = std::string(name) + ".ko";
    if (VLIBCSzListPush(&list, file.c_str()) < 0) {
      VORN_LOG(LOG_ERR, "List push failed");
      break;
    }
    if (VLIBIptablesModInsert("usbmodem_service", list) != 0) {
      VORN_LOG(LOG_ERR, "Can't insmod %s for USBModem", name);
    }
  }
  VLIBCSzListFree(list);
}

int USBModem::BackgroundExec(std::string const& path, std::string const& init,
                             std::string const& baud, std::string const& phone,
                             std::string const& modem, std::string const& user,
                             std::string const& password, std::string const& pidFile,
                             std::string const& logFile) {
  pid_t pid = VLIBCProcForkChildNoWait();
  if (pid < 0) {
    VLIBC_ERR_SET(VLIBC_ERR_EXEC);
    return -1;
  }
  if (pid == 0) {
    int fd = open(logFile.c_str(), O_RDWR | O_CREAT, 0600);
    if (fd < 0) {
      VORN_LOG(LOG_ERR, "open file %s failed", logFile.c_str());
      _exit(1);
    }
    VLIBCProcPidFileCreate(pidFile.c_str());
    dup2(fd, 2);
    VLIBCFileCloseLock();
    setsid();
    execl(path.c_str(), path.c_str(), init.c_str(), baud.c_str(), modem.c_str(), phone.c_str(),
          user.c_str(), password.c_str(), "Stupid Mode=1", static_cast<char*>(nullptr));
    abort();
  }
  // Reaped by the main loop when it ends; liveness is read from the pid file meanwhile.
  g_child_watch_add(pid, ReapChild, nullptr);
  return 1;
}

int USBModem::NetConnectSteps(unsigned int) {
  bool flag = false;
  std::string pinStatus = GetPINStatus(flag);
  if (flag || pinStatus != "ready") {
    VORN_LOG(LOG_ERR, "Net connect failed: sim card is not ready");
    return -1;
  }
  flag = false;
  if (!IsNetDisconnected(flag)) {
    VORN_LOG(LOG_ERR, "%s is not disconnected", GetDevId().c_str());
    return -1;
  }
  flag = false;
  Json::Value profile = GetProfile(flag);
  if (flag) {
    VORN_LOG(LOG_ERR, "Net connect error: profile init failed");
    return -1;
  }
  std::string node;
  if (_simHandler.GetConnectNode(node) != 0) {
    VORN_LOG(LOG_ERR, "error on setting connect device node while connection");
    return -1;
  }

  std::string number = ProfileText(profile, "number");
  std::string user = ProfileText(profile, "user");
  std::string pass = ProfileText(profile, "pass");
  if (!IsDialableNumber(number) || !IsPlainText(user) || !IsPlainText(pass) ||
      !IsPlainText(node)) {
    VORN_LOG(LOG_ERR, "Net connect error: profile holds characters that cannot be dialled");
    return -1;
  }
  std::string init = "Init1=ATZ";
  std::string baud = "Baud=460800";
  std::string modem = "Modem=" + node;
  std::string phone = "Phone=" + (number.empty() ? std::string("*99***1#") : number);
  std::string username = "Username=" + (user.empty() ? std::string("Unknown") : user);
  std::string password = "Password=" + (pass.empty() ? std::string("Unknown") : pass);

  if (SetDefaultRoute(ProfileText(profile, "default_gw")) != 0) {
    VORN_LOG(LOG_ERR, "Net connect error: failed on set default route");
    return -1;
  }
  InsertPPPModules();
  _pidFile = kPidFilePrefix + std::to_string(_ifid);

  flag = false;
  std::string logFile = WvdialLogPath(flag);
  if (flag) {
    VORN_LOG(LOG_ERR, "Error on getting IMSI for log file");
    return -1;
  }
  unlink(logFile.c_str());
  // The dialler's log holds its chat with the network: readable by its owner only from the start.
  const int logFd = open(logFile.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOCTTY, 0600);
  if (logFd < 0) {
    VORN_LOG(LOG_ERR, "Error on init logfile %s, but continue", logFile.c_str());
  } else {
    fchmod(logFd, 0600);
    close(logFd);
  }

  if (BackgroundExec(kWvdialPath, init, baud, phone, modem, username, password, _pidFile,
                     logFile) < 0) {
    return -1;
  }
  for (int round = 0; round < 5; ++round) {
    if (IsWvdialUp()) break;
    VORN_LOG(LOG_ERR, "Wait for wvdial process up, sleep 1 sec");
    sleep(1);
  }
  return 1;
}

int USBModem::NetConnect(unsigned int attempts) {
  int result = -1;
  if (_busy) {
    VORN_LOG(LOG_ERR, "error on connection establish when busy");
  } else {
    _busy = true;
    _newPlugIn = false;
    _dialAttempts = attempts;
    result = NetConnectSteps(attempts);
  }
  if (result < 0) {
    result = -1;
    ++_dialFailCount;
  }
  _busy = false;
  return result;
}

int USBModem::NetDisconnect() {
  _newPlugIn = false;
  _pidFile = kPidFilePrefix + std::to_string(_ifid);
  if (VLIBCFileExist(_pidFile.c_str()) != 1) {
    VORN_LOG(LOG_ERR, "failed on disconnect, cannot find pidfile %s", _pidFile.c_str());
    return -1;
  }
  const pid_t dialler = VLIBCReadPidFile(_pidFile.c_str());
  if (VLIBCProcSignalByPidFile(_pidFile.c_str(), SIGTERM, 0, 0) != 0) {
    VORN_LOG(LOG_ERR, "failed on disconnect with sending signal %d with pidfile %s", SIGTERM,
             _pidFile.c_str());
    return -1;
  }
  // A one-port dongle's node goes back to the queries below: while the dialler still runs it
  // holds the node (and its lock), and the next query could not open it.
  if (!WaitForDiallerEnd(dialler)) {
    VORN_LOG(LOG_WARNING, "dialler %d still running %d ms after SIGTERM", static_cast<int>(dialler),
             kDiallerEndWaitMs);
  }
  unlink(_pidFile.c_str());
  _pidFile.clear();
  _ifName.clear();
  _localIP.clear();
  _simHandler.ReleaseConnectNode();
  bool flag = false;
  GetProfile(flag);
  if (flag) {
    VORN_LOG(LOG_ERR, "get default gw from profile failed");
    return -1;
  }
  if (ReloadFirewall() != 0) {
    VORN_LOG(LOG_ERR, "Error to fork");
    return -1;
  }
  return 0;
}

int USBModem::NetTryAutoConnect() {
  if (IsError()) {
    VORN_LOG(LOG_INFO, "USBModem [%d] is error", _ifid);
    return -1;
  }
  if (!IsInited()) {
    VORN_LOG(LOG_WARNING, "USBModem [%d] is not inited", _ifid);
    return -1;
  }
  if (!IsNewPlugIn()) {
    VORN_LOG(LOG_INFO, "USBModem [%d] is not new", _ifid);
    return -1;
  }
  VORN_LOG(LOG_INFO, "USBModem [%d] is new plug in", _ifid);
  bool flag = false;
  if (GetPINStatus(flag) != "ready" || flag) {
    VORN_LOG(LOG_INFO, "USBModem [%d] pin is not ready", _ifid);
    return -1;
  }
  UpdateNetStatus();
  flag = false;
  if (!IsNetDisconnected(flag)) {
    if (!flag) {
      VORN_LOG(LOG_WARNING, "USBModem [%d] is not disconnected", _ifid);
      return -1;
    }
  }
  if (flag) {
    VORN_LOG(LOG_WARNING, "Failed to get net status of USBModem [%d]", _ifid);
    IncreaseErrorCounter();
    return -1;
  }
  if (PINGetEnableProtection() == 1) {
    VORN_LOG(LOG_INFO, "USBModem [%d] has pin protect", _ifid);
    return -1;
  }
  VORN_LOG(LOG_INFO, "USBModem [%d] try connecting for new plug in", _ifid);
  if (NetConnect(3) < 0) {
    VORN_LOG(LOG_WARNING, "USBModem [%d] failed to auto connect", _ifid);
    IncreaseErrorCounter();
    return 0;
  }
  VORN_LOG(LOG_INFO, "USBModem [%d] success on auto connect", _ifid);
  return 1;
}

// ---------------------------------------------------------------------------------------------

USBModemNull::USBModemNull() : USBModem(0, std::string()) {}

USBModemNull::~USBModemNull() {}

std::string USBModemNull::GetDevId() const { return std::string(); }

bool USBModemNull::IsNull() const { return true; }

bool USBModemNull::IsInited() const { return false; }

bool USBModemNull::IsInfoExist() const { return false; }

}  // namespace usbmodem_lib
}  // namespace vornwireless

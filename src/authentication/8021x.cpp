#include "vornwireless/authentication/8021x.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <mutex>
#include <string>
#include <utility>
#include <vector>

#include "vornplatform/crypt.h"
#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/proc.h"
#include "vornplatform/str.h"
#include "vornwireless/utils/file.h"

namespace vornnetwork {
namespace authentication {

const char* const kAuth8021XDir = "/usr/vorn/etc/8021X/";
const char* const kAuthWpaConfPrefix = "/usr/vorn/etc/wpa_supplicant.conf.";

namespace {

constexpr int kBufSize = 1024;
const char kInitctl[] = "/sbin/initctl";
const char kJob[] = "8021x-client";
const char kWpaCli[] = "/usr/sbin/wpa_cli";
const char kOpenssl[] = "/usr/bin/openssl";
const char kCopy[] = "/bin/cp";
// The one scratch file of the modulus comparison: verifications run one at a time.
const char kScratch[] = "/tmp/8021X";
std::mutex scratchMutex;

const char* const kNull = nullptr;

std::string Dir() { return kAuth8021XDir; }
std::string CfgPath(const std::string& ifname) { return Dir() + "cfg-" + ifname; }
std::string CaPath(const std::string& ifname) { return Dir() + ifname + "_ca.crt"; }
std::string UserPath(const std::string& ifname) { return Dir() + ifname + "_user.crt"; }
std::string KeyPath(const std::string& ifname) { return Dir() + ifname + ".key"; }
std::string PacPath(const std::string& ifname) { return Dir() + ifname + ".pac"; }
std::string WpaConfPath(const std::string& ifname) { return kAuthWpaConfPrefix + ifname; }

bool Exists(const std::string& path) { return VLIBCFileExist(path.c_str()) == 1; }

bool CheckIfname(const std::string& ifname) {
  if (Auth8021XIsValidIfname(ifname)) return true;
  VORN_LOG(LOG_ERR, "Invalid interface name [%s]", ifname.c_str());
  return false;
}

// A value that goes between double quotes of the supplicant's configuration: a quote or a line
// break would end the value early or start a line of its own.
bool IsQuotable(const std::string& value) {
  return value.find_first_of("\"\r\n") == std::string::npos;
}

std::string Quoted(const std::string& value) { return "\"" + value + "\""; }

// Replaces path with content: a temporary file beside it, fsync, rename.
int WriteFileAtomic(const std::string& path, const std::string& content, mode_t mode) {
  std::string tmpl = path + ".XXXXXX";
  std::vector<char> tmp(tmpl.begin(), tmpl.end());
  tmp.push_back('\0');
  int fd = mkostemp(tmp.data(), O_CLOEXEC);
  if (fd < 0) return -1;
  bool ok = fchmod(fd, mode) == 0;
  size_t done = 0;
  while (ok && done < content.size()) {
    ssize_t n = write(fd, content.data() + done, content.size() - done);
    if (n < 0 && errno == EINTR) continue;
    if (n <= 0) {
      ok = false;
      break;
    }
    done += static_cast<size_t>(n);
  }
  ok = ok && fsync(fd) == 0;
  ok = close(fd) == 0 && ok;
  ok = ok && rename(tmp.data(), path.c_str()) == 0;
  if (!ok) {
    unlink(tmp.data());
    return -1;
  }
  return 0;
}

// A path handed to a program as an operand: one that starts with "-" would read as an option.
std::string Operand(const std::string& path) {
  if (!path.empty() && path[0] == '-') return "./" + path;
  return path;
}

// Copies src over dst with /bin/cp through a temporary name beside dst, so that a reader sees
// the old file or the new one. 0 or -1.
int CopyFile(const std::string& src, const std::string& dst, mode_t mode) {
  std::string slashDir = dst.substr(0, dst.rfind('/') + 1);
  std::string tmp = slashDir + "." + dst.substr(slashDir.size()) + ".new";
  unlink(tmp.c_str());
  if (VLIBCExec(kCopy, Operand(src).c_str(), tmp.c_str(), kNull, kNull) != 0) {
    unlink(tmp.c_str());
    return -1;
  }
  if (mode != 0 && chmod(tmp.c_str(), mode) != 0) {
    unlink(tmp.c_str());
    return -1;
  }
  if (rename(tmp.c_str(), dst.c_str()) != 0) {
    unlink(tmp.c_str());
    return -1;
  }
  return 0;
}

// One line of a program's output into buf. 0, or -1 when it could not run or printed nothing.
int ReadOneLine(FILE* fp, char* buf, int size) {
  if (fp == nullptr) return -1;
  int rc = fgets(buf, size, fp) == nullptr ? -1 : 0;
  VLIBCPclose(fp);
  return rc;
}

// The md5 digest line of the modulus that "openssl <kind> -noout -modulus" prints for path.
int ModulusDigest(const char* kind, const char* path, std::string& digest) {
  char szBuf[kBufSize] = {0};
  FILE* fp = VLIBCPopen(kOpenssl, "r", kind, "-noout", "-modulus", "-in", path, kNull);
  if (ReadOneLine(fp, szBuf, sizeof szBuf) != 0) {
    VORN_LOG(LOG_ERR, "Get md5 failed %s", path);
    return -1;
  }
  char* modulus = strrchr(szBuf, '=');
  if (modulus == nullptr) {
    VORN_LOG(LOG_ERR, "strrchr(szBuf, '=') error.");
    return -1;
  }
  ++modulus;
  // A fresh file: never follow a link someone left at the scratch path.
  unlink(kScratch);
  int fd = open(kScratch, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600);
  FILE* out = fd < 0 ? nullptr : fdopen(fd, "w");
  if (out == nullptr) {
    if (fd >= 0) close(fd);
    VORN_LOG(LOG_ERR, "fopen failed");
    return -1;
  }
  bool written = fputs(modulus, out) >= 0;
  written = fclose(out) == 0 && written;
  if (!written) {
    VORN_LOG(LOG_ERR, "fputs failed");
    unlink(kScratch);
    return -1;
  }
  char md5[kBufSize] = {0};
  fp = VLIBCPopen(kOpenssl, "r", "md5", kScratch, kNull);
  int rc = ReadOneLine(fp, md5, sizeof md5);
  unlink(kScratch);
  if (rc != 0) {
    VORN_LOG(LOG_ERR, "Get md5 failed");
    return -1;
  }
  digest = md5;
  return 0;
}

}  // namespace

// ---------------------------------------------------------------------------------------------
// Names

template <>
bool AuthEnumMap<AUTH_EAP>::StringToEnum(const std::string& text, AUTH_EAP& value) {
  static const struct {
    const char* name;
    AUTH_EAP value;
  } kMap[] = {{"auto", AUTH_EAP_AUTO},
              {"peap", AUTH_EAP_PEAP},
              {"ttls", AUTH_EAP_TTLS},
              {"tls", AUTH_EAP_TLS},
              {"fast", AUTH_EAP_FAST}};
  for (const auto& entry : kMap) {
    if (text == entry.name) {
      value = entry.value;
      return true;
    }
  }
  return false;
}

template <>
std::string AuthEnumMap<AUTH_EAP>::EnumToString(AUTH_EAP value) {
  switch (value) {
    case AUTH_EAP_AUTO:
      return "auto";
    case AUTH_EAP_PEAP:
      return "peap";
    case AUTH_EAP_TTLS:
      return "ttls";
    case AUTH_EAP_TLS:
      return "tls";
    case AUTH_EAP_FAST:
      return "fast";
  }
  return "";
}

template <>
bool AuthEnumMap<AUTH_PHASE2>::StringToEnum(const std::string& text, AUTH_PHASE2& value) {
  static const struct {
    const char* name;
    AUTH_PHASE2 value;
  } kMap[] = {{"pap", AUTH_PHASE2_PAP},
              {"gtc", AUTH_PHASE2_GTC},
              {"mschap", AUTH_PHASE2_MSCHAP},
              {"mschapv2", AUTH_PHASE2_MSCHAPV2}};
  for (const auto& entry : kMap) {
    if (text == entry.name) {
      value = entry.value;
      return true;
    }
  }
  return false;
}

template <>
std::string AuthEnumMap<AUTH_PHASE2>::EnumToString(AUTH_PHASE2 value) {
  switch (value) {
    case AUTH_PHASE2_PAP:
      return "pap";
    case AUTH_PHASE2_GTC:
      return "gtc";
    case AUTH_PHASE2_MSCHAP:
      return "mschap";
    case AUTH_PHASE2_MSCHAPV2:
      return "mschapv2";
  }
  return "";
}

bool Auth8021XIsValidIfname(const std::string& name) {
  if (name.empty() || name.size() > 15 || name == "." || name == "..") return false;
  for (unsigned char c : name) {
    if (c == '/' || c == ':' || c <= ' ' || c == 0x7f) return false;
  }
  return true;
}

// ---------------------------------------------------------------------------------------------
// The client job

int Auth8021XStartDaemon(const std::string& ifname, bool test) {
  if (!CheckIfname(ifname)) return -1;
  std::string iface = "IFACE=" + ifname;
  int rc = VLIBCExec(kInitctl, "start", kJob, iface.c_str(), test ? "TEST=true" : "TEST=false");
  return rc < 0 ? -1 : (rc > 0 ? 1 : 0);
}

int Auth8021XStopDaemon(const std::string& ifname, bool /*test*/) {
  if (!CheckIfname(ifname)) return -1;
  std::string iface = "IFACE=" + ifname;
  int rc = VLIBCExec(kInitctl, "stop", kJob, iface.c_str(), kNull);
  return rc < 0 ? -1 : (rc > 0 ? 1 : 0);
}

int Auth8021XGetStatus(const std::string& ifname, std::string& status) {
  status = "unknown";
  if (!CheckIfname(ifname)) return -1;
  sleep(1);
  FILE* fp = VLIBCPopen(kWpaCli, "r", "-i", ifname.c_str(), "status", kNull);
  if (fp == nullptr) return 0;
  char line[kBufSize];
  char state[kBufSize] = {0};
  bool found = false;
  while (fgets(line, sizeof line, fp) != nullptr) {
    if (strstr(line, "EAP state") == nullptr) continue;
    found = sscanf(line, "EAP state=%1023s", state) == 1;
    break;
  }
  VLIBCPclose(fp);
  if (!found) return 0;
  if (strncmp(state, "SUCCESS", 7) == 0) {
    status = "authenticated";
  } else if (strncmp(state, "FAILURE", 7) == 0) {
    status = "unauthenticated";
  } else if (strncmp(state, "IDLE", 4) == 0) {
    status = "authenticating";
  }
  return 0;
}

// ---------------------------------------------------------------------------------------------
// Settings

int Auth8021XGetConf(const std::string& ifname, ConfigNoSection& cfg) {
  if (!CheckIfname(ifname)) return -1;
  cfg.SetName(CfgPath(ifname));
  if (!Exists(cfg.GetNameString())) {
    VORN_LOG(LOG_INFO, "No 802.1X config");
    cfg.AddKeyValue("enable", false);
    return 0;
  }
  if (cfg.Read() < 0) {
    VORN_LOG(LOG_ERR, "Failed to read 802.1X config");
    return -1;
  }
  return 0;
}

namespace {

// Writes the settings to the interface's file (mode 0600: it holds the enciphered password). A
// key or value that would break the key=value lines is refused before anything is written.
int WriteSettings(const std::string& ifname, ConfigNoSection& cfg) {
  cfg.SetName(CfgPath(ifname));
  for (const auto& kv : cfg.GetKeyValues()) {
    if (kv.first.empty() || kv.first.find_first_of("=\r\n#") != std::string::npos ||
        kv.first.find_first_of(" \t") == 0 ||
        kv.second.find_first_of("\r\n") != std::string::npos) {
      return -1;
    }
  }
  if (cfg.Write() < 0) return -1;
  if (chmod(cfg.GetNameCString(), 0600) != 0) return -1;
  return 0;
}

}  // namespace

int Auth8021XSetConf(const std::string& ifname, ConfigNoSection& cfg, bool test) {
  if (!CheckIfname(ifname)) return -1;
  if (cfg.GetKeyValue("enable") == "yes") {
    if (WriteWpaConf(ifname, cfg) < 0) {
      VORN_LOG(LOG_ERR, "Failed to Write wpa_supplicant config file");
      return -1;
    }
    if (Auth8021XStopDaemon(ifname, test) < 0) {
      VORN_LOG(LOG_INFO, "failed to stop 8021x daemon");
    }
    if (Auth8021XStartDaemon(ifname, test) < 0) {
      VORN_LOG(LOG_ERR, "Failed to Start wpa_supplicant");
      return -1;
    }
  } else {
    if (Auth8021XStopDaemon(ifname, test) < 0) {
      VORN_LOG(LOG_ERR, "Failed to Start wpa_supplicant");
      return -1;
    }
    std::string conf = WpaConfPath(ifname);
    if (Exists(conf)) unlink(conf.c_str());
  }
  if (!test && WriteSettings(ifname, cfg) < 0) {
    VORN_LOG(LOG_ERR, "Failed to write config file");
    return -1;
  }
  return 0;
}

// ---------------------------------------------------------------------------------------------
// The supplicant's configuration

int WriteWpaConf(const std::string& ifname, ConfigNoSection& cfg) {
  if (!CheckIfname(ifname)) return -1;
  std::string identity = cfg.GetKeyValue("identity");
  std::string password;
  std::string cipher = cfg.GetKeyValue("password");
  if (!cipher.empty()) {
    char clear[kBufSize] = {0};
    if (VLIBCCryptSzDecrypt(cipher.c_str(), clear, sizeof clear) == 0) {
      VORN_LOG(LOG_ERR, "Failed to decrypt password");
      return -1;
    }
    password = clear;
    memset(clear, 0, sizeof clear);
  }
  std::string anonymous = cfg.GetKeyValue("anonymous_identity");
  std::string keyPassword = cfg.GetKeyValue("key_password");
  const struct {
    const char* key;
    const std::string& value;
  } quoted[] = {{"identity", identity},
                {"password", password},
                {"anonymous_identity", anonymous},
                {"key_password", keyPassword}};
  for (const auto& q : quoted) {
    if (!IsQuotable(q.value)) {
      // The value itself may be a secret: only its name is logged.
      VORN_LOG(LOG_ERR, "Quote or line break in [%s]", q.key);
      return -1;
    }
  }

  std::string eapName = cfg.GetKeyValue("eap");
  AUTH_EAP eap;
  if (!AuthEnumMap<AUTH_EAP>::StringToEnum(eapName, eap)) {
    VORN_LOG(LOG_ERR, "Unknown EAP-Type [%s]", eapName.c_str());
    return -1;
  }

  std::string text =
      "ctrl_interface=/var/run/wpa_supplicant\n"
      "eapol_version=2\n"
      "ap_scan=0\n"
      "network={\n"
      "\tkey_mgmt=IEEE8021X\n";
  auto line = [&text](const std::string& key, const std::string& value) {
    text += "\t" + key + "=" + value + "\n";
  };
  auto certificate = [&line](const char* key, const std::string& path) {
    if (Exists(path)) line(key, Quoted(path));
  };
  auto tunnel = [&]() -> int {
    line("identity", Quoted(identity));
    line("password", Quoted(password));
    line("phase1", Quoted("peaplabel=1"));
    std::string phase2Name = cfg.GetKeyValue("phase2");
    AUTH_PHASE2 phase2 = AUTH_PHASE2_PAP;
    bool known = AuthEnumMap<AUTH_PHASE2>::StringToEnum(phase2Name, phase2);
    if (known && phase2 == AUTH_PHASE2_GTC) {
      line("phase2", Quoted("auth=GTC"));
    } else if (known && phase2 == AUTH_PHASE2_MSCHAPV2) {
      line("phase2", Quoted("auth=MSCHAPV2"));
    } else {
      VORN_LOG(LOG_ERR, "Unknown PHASE2-Type [%s]", phase2Name.c_str());
      return -1;
    }
    certificate("ca_cert", CaPath(ifname));
    return 0;
  };

  switch (eap) {
    case AUTH_EAP_FAST:
      line("eap", "FAST");
      line("identity", Quoted(identity));
      line("password", Quoted(password));
      line("phase1", Quoted("fast_provisioning=1"));
      line("pac_file", Quoted("blob://eap-fast-pac"));
      break;
    case AUTH_EAP_TLS:
      line("eap", "TLS");
      line("identity", Quoted(identity));
      certificate("ca_cert", CaPath(ifname));
      certificate("client_cert", UserPath(ifname));
      certificate("private_key", KeyPath(ifname));
      line("private_key_passwd", Quoted(keyPassword));
      break;
    case AUTH_EAP_TTLS:
      line("eap", "TTLS");
      if (tunnel() < 0) return -1;
      break;
    case AUTH_EAP_PEAP:
      line("eap", "PEAP");
      if (tunnel() < 0) return -1;
      break;
    case AUTH_EAP_AUTO:
      line("eap", "TTLS PEAP");
      line("identity", Quoted(identity));
      line("password", Quoted(password));
      break;
  }
  if (!anonymous.empty()) line("anonymous_identity", Quoted(anonymous));
  if (eap == AUTH_EAP_TLS) line("fragment_size", "1300");
  line("eapol_flags", "0");
  text += "}\n";

  std::string path = WpaConfPath(ifname);
  int rc = WriteFileAtomic(path, text, 0600);
  std::fill(text.begin(), text.end(), '\0');
  std::fill(password.begin(), password.end(), '\0');
  if (rc != 0) {
    VORN_LOG(LOG_ERR, "Failed to open file [%s].", path.c_str());
    return -1;
  }
  return 0;
}

// ---------------------------------------------------------------------------------------------
// Certificates and keys

int checkHeaderType(const char* path, const char* header, __tag_CYPHER* cypher) {
  FILE* fp = path == nullptr ? nullptr : fopen(path, "re");
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "Open CA file failed");
    return -1;
  }
  char line[kBufSize] = {0};
  char* got = fgets(line, sizeof line, fp);
  fclose(fp);
  if (got == nullptr) {
    VORN_LOG(LOG_ERR, "Read CA file failed");
    return -1;
  }
  if (!VLIBCUnicodeIsUTF8(line)) return -4;
  if (strstr(line, header) == nullptr) {
    if (strcmp(header, "CERTIFICATE") == 0) return -2;
    if (strcmp(header, "PRIVATE KEY") == 0) return -3;
    return -1;
  }
  if (strcmp(header, "PRIVATE KEY") == 0) {
    __tag_CYPHER found;
    if (strstr(line, "DSA") != nullptr) {
      found = CYPHER_DSA;
    } else if (strstr(line, "RSA") != nullptr) {
      found = CYPHER_RSA;
    } else {
      return -7;
    }
    if (cypher != nullptr) *cypher = found;
  }
  return 0;
}

int verifyCA(const char* path) {
  if (VLIBCFileUTF8BomStrip(path) != 0) {
    VORN_LOG(LOG_ERR, "Failed to strip utf8 BOM");
    return -4;
  }
  FILE* fp = VLIBCPopen(kOpenssl, "r", "x509", "-noout", "-hash", "-in", path, kNull);
  if (fp == nullptr) {
    VORN_LOG(LOG_ERR, "openssl failed");
    return -2;
  }
  char line[kBufSize] = {0};
  if (ReadOneLine(fp, line, sizeof line) != 0) {
    VORN_LOG(LOG_ERR, "Get md5 failed");
    return -2;
  }
  return 0;
}

int verifyCrtAndKey(const char* crt, const char* key) {
  if (VLIBCFileUTF8BomStrip(crt) != 0 || VLIBCFileUTF8BomStrip(key) != 0) {
    VORN_LOG(LOG_ERR, "Failed to strip utf8 BOM");
    return -4;
  }
  std::lock_guard<std::mutex> hold(scratchMutex);
  std::string crtDigest, keyDigest;
  if (ModulusDigest("x509", crt, crtDigest) != 0) {
    VORN_LOG(LOG_ERR, "get md5 failed crt=%s", crt);
    return -2;
  }
  if (ModulusDigest("rsa", key, keyDigest) != 0) {
    VORN_LOG(LOG_ERR, "get md5 failed key=%s", key);
    return -3;
  }
  if (crtDigest != keyDigest) {
    VORN_LOG(LOG_ERR, "certificate & key is not matching");
    return -6;
  }
  return 0;
}

int Auth8021XUploadCert(const std::string& ifname, const int& type, const std::string& path) {
  if (!CheckIfname(ifname)) return -1;
  ConfigNoSection cfg;
  Auth8021XGetConf(ifname, cfg);
  if (VLIBCFileCheckDir(kAuth8021XDir) != 1 &&
      vornwireless::utils::CheckAndMakeDir(kAuth8021XDir, 0755) != 0) {
    VORN_LOG(LOG_ERR, "Failed to mkdir [%s]", kAuth8021XDir);
    return -1;
  }
  const char* src = path.c_str();
  std::string dst;
  std::string timeKey;
  int rc = 0;
  switch (type) {
    case AUTH_FILE_CA_CERT:
    case AUTH_FILE_USER_CERT: {
      rc = checkHeaderType(src, "CERTIFICATE", nullptr);
      if (rc != 0) {
        VORN_LOG(LOG_ERR, "Check Crt header failed.");
        return rc;
      }
      rc = verifyCA(src);
      if (rc != 0) {
        VORN_LOG(LOG_ERR, "Verify CA failed.");
        return rc;
      }
      bool ca = type == AUTH_FILE_CA_CERT;
      dst = ca ? CaPath(ifname) : UserPath(ifname);
      timeKey = ca ? "ca_cert_update_time" : "user_cert_update_time";
      if (CopyFile(src, dst, 0) != 0) {
        VORN_LOG(LOG_ERR, "%s", ca ? "Copy CA crt file fail." : "Copy User Crt file fail.");
        return 0;
      }
      break;
    }
    case AUTH_FILE_KEY: {
      __tag_CYPHER cypher = CYPHER_UNKNOWN;
      rc = checkHeaderType(src, "PRIVATE KEY", &cypher);
      if (rc != 0) {
        VORN_LOG(LOG_ERR, "Check Key header failed.");
        return rc;
      }
      if (cypher == CYPHER_DSA) {
        VORN_LOG(LOG_ERR, "Not Support DSA certificate anymore");
        return -5;
      }
      std::string user = UserPath(ifname);
      if (!Exists(user)) {
        VORN_LOG(LOG_ERR, "No User Certificate");
        return -6;
      }
      rc = verifyCrtAndKey(user.c_str(), src);
      if (rc != 0) {
        VORN_LOG(LOG_ERR, "Verify Crt and Key failed.");
        return rc;
      }
      dst = KeyPath(ifname);
      timeKey = "key_update_time";
      if (CopyFile(src, dst, 0600) != 0) {
        VORN_LOG(LOG_ERR, "Copy Key file fail.");
        return 0;
      }
      break;
    }
    case AUTH_FILE_PAC:
      dst = PacPath(ifname);
      if (CopyFile(src, dst, 0600) != 0) {
        VORN_LOG(LOG_ERR, "Copy PAC file fail.");
        return -1;
      }
      break;
    default:
      VORN_LOG(LOG_ERR, "Unknown file, stop uploading.");
      return -1;
  }
  struct stat st;
  if (stat(dst.c_str(), &st) != 0) {
    VORN_LOG(LOG_ERR, "Get stat fail.");
    return 0;
  }
  // The PAC credential has no update time: the settings are left as they are.
  if (timeKey.empty()) return 0;
  char date[32] = {0};
  struct tm when;
  localtime_r(&st.st_mtime, &when);
  strftime(date, sizeof date, "%Y/%m/%d", &when);
  cfg.AddKeyValue(timeKey, date);
  if (WriteSettings(ifname, cfg) < 0) {
    VORN_LOG(LOG_ERR, "Failed to write config file");
    return 0;
  }
  return 0;
}

int Auth8021XDeleteCert(const std::string& ifname, const int& type) {
  if (!CheckIfname(ifname)) return -1;
  ConfigNoSection cfg;
  Auth8021XGetConf(ifname, cfg);
  std::string path;
  std::string timeKey;
  const char* failure = nullptr;
  switch (type) {
    case AUTH_FILE_CA_CERT:
      path = CaPath(ifname);
      timeKey = "ca_cert_update_time";
      failure = "Remove CA crt file fail.";
      break;
    case AUTH_FILE_USER_CERT:
      path = UserPath(ifname);
      timeKey = "user_cert_update_time";
      failure = "Remove User Crt file fail.";
      break;
    case AUTH_FILE_KEY:
      path = KeyPath(ifname);
      timeKey = "key_update_time";
      failure = "Remove Key file fail.";
      break;
    case AUTH_FILE_PAC:
      path = PacPath(ifname);
      failure = "Remove PAC file fail.";
      break;
    default:
      VORN_LOG(LOG_ERR, "Unknown file, stop delete action.");
      return -1;
  }
  if (unlink(path.c_str()) != 0) {
    VORN_LOG(LOG_ERR, "%s", failure);
    return -1;
  }
  if (timeKey.empty()) return 0;
  cfg.AddKeyValue(timeKey, "");
  if (WriteSettings(ifname, cfg) < 0) {
    VORN_LOG(LOG_ERR, "Failed to write config file");
    return -1;
  }
  return 0;
}

int Auth8021XChangeInterface(const std::string& oldName, const std::string& newName) {
  if (oldName.empty() || newName.empty()) {
    VORN_LOG(LOG_ERR, "No interface name.");
    return -1;
  }
  if (!CheckIfname(oldName) || !CheckIfname(newName)) return -1;
  if (VLIBCFileCheckDir(kAuth8021XDir) != 1) return 0;
  ConfigNoSection cfg;
  if (Auth8021XGetConf(oldName, cfg) < 0) return -1;
  const std::pair<std::string, std::string> moves[] = {{CfgPath(oldName), CfgPath(newName)},
                                                       {CaPath(oldName), CaPath(newName)},
                                                       {UserPath(oldName), UserPath(newName)},
                                                       {KeyPath(oldName), KeyPath(newName)}};
  for (const auto& move : moves) {
    if (!Exists(move.first)) continue;
    if (rename(move.first.c_str(), move.second.c_str()) != 0) {
      VORN_LOG(LOG_ERR, "Failed to rename [%s][%s]", move.first.c_str(), move.second.c_str());
      return -1;
    }
  }
  if (Auth8021XStopDaemon(oldName, false) < 0) {
    VORN_LOG(LOG_ERR, "Failed to Stop wpa_supplicant");
  }
  std::string oldConf = WpaConfPath(oldName);
  if (Exists(oldConf)) unlink(oldConf.c_str());
  if (cfg.GetKeyValue("enable") == "yes" && WriteWpaConf(newName, cfg) < 0) {
    VORN_LOG(LOG_ERR, "Failed to Write wpa_supplicant config file");
    return -1;
  }
  return 0;
}

}  // namespace authentication
}  // namespace vornnetwork

// Port-based (802.1X) authentication of a wired interface: a per-interface settings file and
// certificates under /usr/vorn/etc/8021X/, the wpa_supplicant configuration generated for the
// wired driver, and the "8021x-client" job started and stopped through /sbin/initctl. Free
// functions without state in memory; every failure is logged at LOG_ERR (notes at LOG_INFO).
#ifndef VORNWIRELESS_AUTHENTICATION_8021X_H
#define VORNWIRELESS_AUTHENTICATION_8021X_H

#include <string>

#include "vornwireless/utils/config.h"

namespace vornnetwork {
namespace authentication {

using vornwireless::utils::ConfigNoSection;

// The directory of the settings and certificates, with its trailing slash.
extern const char* const kAuth8021XDir;  // "/usr/vorn/etc/8021X/"
// The generated configuration is kAuthWpaConfPrefix + interface.
extern const char* const kAuthWpaConfPrefix;  // "/usr/vorn/etc/wpa_supplicant.conf."

enum AUTH_EAP {
  AUTH_EAP_AUTO = 0,
  AUTH_EAP_PEAP = 1,
  AUTH_EAP_TTLS = 2,
  AUTH_EAP_TLS = 3,
  AUTH_EAP_FAST = 4,
};

enum AUTH_PHASE2 {
  AUTH_PHASE2_PAP = 0,
  AUTH_PHASE2_GTC = 1,
  AUTH_PHASE2_MSCHAP = 2,
  AUTH_PHASE2_MSCHAPV2 = 3,
};

// File types of uploads and deletions.
enum AUTH_FILE {
  AUTH_FILE_CA_CERT = 0,
  AUTH_FILE_USER_CERT = 1,
  AUTH_FILE_KEY = 2,
  AUTH_FILE_PAC = 3,
};

// The key algorithm a private key's first line names.
typedef enum __tag_CYPHER {
  CYPHER_UNKNOWN = 0,
  CYPHER_RSA = 1,
  CYPHER_DSA = 2,
} CYPHER;

// Names of the enumerations ("auto", "peap", ... / "pap", "gtc", ...), compared exactly.
template <typename T>
struct AuthEnumMap {
  // true and value set when text names a member; false (value untouched) otherwise.
  static bool StringToEnum(const std::string& text, T& value);
  static std::string EnumToString(T value);
};
template <>
bool AuthEnumMap<AUTH_EAP>::StringToEnum(const std::string& text, AUTH_EAP& value);
template <>
std::string AuthEnumMap<AUTH_EAP>::EnumToString(AUTH_EAP value);
template <>
bool AuthEnumMap<AUTH_PHASE2>::StringToEnum(const std::string& text, AUTH_PHASE2& value);
template <>
std::string AuthEnumMap<AUTH_PHASE2>::EnumToString(AUTH_PHASE2 value);

// "/sbin/initctl" "start" "8021x-client" "IFACE=<if>" "TEST=true|false" / "stop" ...: the sign of
// the command's result: 0 success, 1 the job refused (non-zero exit), -1 it could not run.
int Auth8021XStartDaemon(const std::string& ifname, bool test);
int Auth8021XStopDaemon(const std::string& ifname, bool test);

// After one second, the supplicant's "EAP state" as "authenticated", "unauthenticated",
// "authenticating" or "unknown" (also without a supplicant). 0; -1 for a bad interface name.
int Auth8021XGetStatus(const std::string& ifname, std::string& status);

// Reads the settings of the interface into cfg (whose name becomes the settings path). Without
// a settings file cfg gets enable=no and the result is 0. -1 when the file cannot be read.
int Auth8021XGetConf(const std::string& ifname, ConfigNoSection& cfg);
// Applies cfg: with enable=yes writes the configuration and restarts the client, otherwise stops
// it and removes the configuration; then, unless test is set, stores cfg as the settings of the
// interface. 0 or -1.
int Auth8021XSetConf(const std::string& ifname, ConfigNoSection& cfg, bool test);

// Verifies and stores an uploaded file of the given AUTH_FILE type. 0 when stored (also when the
// copy itself failed); -1 bad type or directory; checkHeaderType's and verify* codes; -5 a DSA
// key; -6 a key without a stored client certificate.
int Auth8021XUploadCert(const std::string& ifname, const int& type, const std::string& path);
// Removes the stored file of that type and clears its update time. 0 or -1.
int Auth8021XDeleteCert(const std::string& ifname, const int& type);
// Moves settings, certificates and key from one interface name to another. 0 or -1.
int Auth8021XChangeInterface(const std::string& oldName, const std::string& newName);

// Steps of the functions above.

// Writes kAuthWpaConfPrefix + ifname from cfg (mode 0600, replaced atomically). 0 or -1.
int WriteWpaConf(const std::string& ifname, ConfigNoSection& cfg);
// Looks at the first line of path only. 0 when it holds header (for "PRIVATE KEY" *cypher is set
// when cypher is not NULL); -1 open/read failure or another header missing; -2 no
// "CERTIFICATE"; -3 no "PRIVATE KEY"; -4 not UTF-8; -7 a private key neither RSA nor DSA.
int checkHeaderType(const char* path, const char* header, __tag_CYPHER* cypher);
// Strips a UTF-8 BOM from path in place and lets openssl parse it as a certificate. 0, -2, -4.
int verifyCA(const char* path);
// 0 when the certificate and the RSA key have the same modulus; -2 certificate unreadable, -3
// key unreadable, -4 BOM strip failed, -6 they do not match.
int verifyCrtAndKey(const char* crt, const char* key);

// True when name can be a Linux interface name: 1 to 15 characters, not "." or "..", no "/",
// ":" or white space or control characters. Every function above refuses other names.
bool Auth8021XIsValidIfname(const std::string& name);

}  // namespace authentication
}  // namespace vornnetwork

#endif

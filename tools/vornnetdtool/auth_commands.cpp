#include "auth_commands.h"

#include <json/json.h>
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <iostream>
#include <string>
#include <vector>

#include "vornplatform/crypt.h"
#include "vornwireless/authentication/8021x.h"

#pragma GCC diagnostic ignored "-Wdeprecated-declarations"

namespace vornnetdtool {

namespace auth = vornnetwork::authentication;
using vornwireless::utils::ConfigNoSection;

const char kAuth8021XUsage[] =
    "802.1X authentication of a wired interface (JSON request, JSON answer):\n"
    "  8021x status JSON            {\"ifname\"}: authenticated, unauthenticated,\n"
    "                               authenticating or unknown\n"
    "  8021x get-conf JSON          {\"ifname\"}: the stored settings (without the password)\n"
    "  8021x set-conf JSON          {\"ifname\", \"test\", \"conf\": {\"enable\", \"eap\", "
    "\"phase2\",\n"
    "                               \"identity\", \"password\", \"anonymous_identity\",\n"
    "                               \"key_password\"}}: applies the settings over the stored\n"
    "                               ones (password in clear, stored enciphered); with \"test\"\n"
    "                               true the client runs them but they are not stored\n"
    "  8021x upload JSON            {\"ifname\", \"type\", \"path\"}: type ca, user, key, pac\n"
    "                               (or 0 to 3)\n"
    "  8021x delete JSON            {\"ifname\", \"type\"}\n"
    "  8021x start JSON             {\"ifname\", \"test\"}   8021x stop JSON {\"ifname\"}\n"
    "  8021x change-interface JSON  {\"old\", \"new\"}\n"
    "  8021x --help                 this part of the help, with examples\n";

namespace {

const char kExamples[] =
    "\n"
    "Examples:\n"
    "  vornnetdtool 8021x upload '{\"ifname\": \"eth0\", \"type\": \"ca\", \"path\": "
    "\"/tmp/ca.pem\"}'\n"
    "  vornnetdtool 8021x set-conf '{\"ifname\": \"eth0\", \"conf\": {\"enable\": \"yes\",\n"
    "      \"eap\": \"peap\", \"phase2\": \"mschapv2\", \"identity\": \"alice\", \"password\": "
    "\"x\"}}'\n"
    "  vornnetdtool 8021x status '{\"ifname\": \"eth0\"}'\n"
    "  -> {\"result\":0,\"status\":\"authenticated\"}\n"
    "\n"
    "The answer's \"result\" is the operation's code: 0 success; for uploads -1 bad file, type or\n"
    "directory, -2 not a certificate, -3 not a key or an unreadable key, -4 not UTF-8, -5 a DSA\n"
    "key, -6 no client certificate or a key that does not match it, -7 a key neither RSA nor "
    "DSA.\n";

struct Usage {
  std::string message;
};

const char* const kSettings[] = {
    "enable", "eap", "phase2", "identity", "password", "anonymous_identity", "key_password"};

Json::Value Parse(const std::vector<std::string>& rest) {
  if (rest.size() != 1) throw Usage{"needs one JSON object"};
  Json::Reader reader;
  Json::Value value;
  if (!reader.parse(rest[0], value, false) || !value.isObject()) {
    throw Usage{"not a JSON object: " + rest[0]};
  }
  return value;
}

std::string Text(const Json::Value& request, const char* name, bool required = true) {
  const Json::Value& v = request[name];
  if (v.isNull()) {
    if (required) throw Usage{std::string("missing \"") + name + "\""};
    return "";
  }
  if (!v.isString()) throw Usage{std::string("\"") + name + "\" must be a string"};
  return v.asString();
}

bool Flag(const Json::Value& request, const char* name) {
  const Json::Value& v = request[name];
  if (v.isNull()) return false;
  if (!v.isBool()) throw Usage{std::string("\"") + name + "\" must be true or false"};
  return v.asBool();
}

int FileType(const Json::Value& request) {
  const Json::Value& v = request["type"];
  if (v.isInt()) return v.asInt();
  if (v.isString()) {
    const std::string t = v.asString();
    if (t == "ca") return auth::AUTH_FILE_CA_CERT;
    if (t == "user") return auth::AUTH_FILE_USER_CERT;
    if (t == "key") return auth::AUTH_FILE_KEY;
    if (t == "pac") return auth::AUTH_FILE_PAC;
  }
  throw Usage{"\"type\" must be ca, user, key, pac or 0 to 3"};
}

// The JSON answer, printed once the operation is over.
std::string gAnswer;

int Answer(Json::Value answer, int result) {
  answer["result"] = result;
  gAnswer = Json::FastWriter().write(answer);
  return result == 0 ? 0 : 1;
}

// While an operation runs, what the programs it starts print (initctl's job messages, openssl's
// complaints) goes to stderr: stdout carries only the answer.
class StdoutToStderr {
 public:
  StdoutToStderr() {
    std::cout.flush();
    fflush(stdout);
    _saved = fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, 3);
    if (_saved >= 0) dup2(STDERR_FILENO, STDOUT_FILENO);
  }
  ~StdoutToStderr() {
    if (_saved < 0) return;
    fflush(stdout);
    dup2(_saved, STDOUT_FILENO);
    close(_saved);
  }
  StdoutToStderr(const StdoutToStderr&) = delete;
  StdoutToStderr& operator=(const StdoutToStderr&) = delete;

 private:
  int _saved = -1;
};

int SetConf(const Json::Value& request) {
  const std::string ifname = Text(request, "ifname");
  const bool test = Flag(request, "test");
  const Json::Value& conf = request["conf"];
  if (!conf.isObject()) throw Usage{"\"conf\" must be an object"};
  ConfigNoSection cfg;
  if (auth::Auth8021XGetConf(ifname, cfg) < 0) return Answer(Json::Value(Json::objectValue), -1);
  for (const auto& name : conf.getMemberNames()) {
    bool known = false;
    for (const char* k : kSettings) known = known || name == k;
    if (!known) throw Usage{"unknown setting \"" + name + "\""};
    const Json::Value& v = conf[name];
    std::string value;
    if (name == "enable" && v.isBool()) {
      value = v.asBool() ? "yes" : "no";
    } else if (v.isString()) {
      value = v.asString();
    } else {
      throw Usage{"setting \"" + name + "\" must be a string"};
    }
    if (name == "password" && !value.empty()) {
      char cipher[1024] = {0};
      if (VLIBCCryptSzEncrypt(value.c_str(), cipher, sizeof cipher) == 0) {
        throw Usage{"the password cannot be enciphered (too long?)"};
      }
      value = cipher;
    }
    cfg.AddKeyValue(name, value);
  }
  return Answer(Json::Value(Json::objectValue), auth::Auth8021XSetConf(ifname, cfg, test));
}

int Run(const std::vector<std::string>& args) {
  if (args.empty()) throw Usage{"8021x needs a subcommand"};
  const std::string sub = args[0];
  const std::vector<std::string> rest(args.begin() + 1, args.end());
  if (sub == "--help" || sub == "-h" || sub == "help") {
    std::cout << kAuth8021XUsage << kExamples;
    return 0;
  }
  const Json::Value request = Parse(rest);
  StdoutToStderr quiet;
  if (sub == "set-conf") return SetConf(request);
  Json::Value answer(Json::objectValue);
  if (sub == "status") {
    std::string status;
    int rc = auth::Auth8021XGetStatus(Text(request, "ifname"), status);
    answer["status"] = status;
    return Answer(answer, rc);
  }
  if (sub == "get-conf") {
    ConfigNoSection cfg;
    int rc = auth::Auth8021XGetConf(Text(request, "ifname"), cfg);
    Json::Value conf(Json::objectValue);
    for (const auto& kv : cfg.GetKeyValues()) {
      if (kv.first == "password") continue;
      conf[kv.first] = kv.second;
    }
    conf["has_password"] = !cfg.GetKeyValue("password").empty();
    answer["conf"] = conf;
    return Answer(answer, rc);
  }
  if (sub == "upload") {
    return Answer(answer, auth::Auth8021XUploadCert(Text(request, "ifname"), FileType(request),
                                                    Text(request, "path")));
  }
  if (sub == "delete") {
    return Answer(answer, auth::Auth8021XDeleteCert(Text(request, "ifname"), FileType(request)));
  }
  if (sub == "start") {
    return Answer(answer,
                  auth::Auth8021XStartDaemon(Text(request, "ifname"), Flag(request, "test")));
  }
  if (sub == "stop") {
    return Answer(answer, auth::Auth8021XStopDaemon(Text(request, "ifname"), false));
  }
  if (sub == "change-interface") {
    return Answer(answer,
                  auth::Auth8021XChangeInterface(Text(request, "old"), Text(request, "new")));
  }
  throw Usage{"unknown 8021x subcommand " + sub};
}

}  // namespace

int Auth8021XCommand(const std::vector<std::string>& args) {
  try {
    gAnswer.clear();
    int rc = Run(args);
    std::cout << gAnswer;
    return rc;
  } catch (const Usage& e) {
    std::cerr << "vornnetdtool: 8021x: " << e.message
              << "\n(vornnetdtool 8021x --help for usage)\n";
  } catch (const std::exception& e) {
    std::cerr << "vornnetdtool: 8021x: " << e.what() << "\n";
  }
  return 1;
}

}  // namespace vornnetdtool

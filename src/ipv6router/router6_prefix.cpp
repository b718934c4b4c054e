// The /64 prefixes of the IPv6 routers and their LANs.
#include "vornwireless/ipv6router/router6_prefix.h"

#include <arpa/inet.h>

#include <boost/lexical_cast.hpp>
#include <cstring>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/szhash.h"

namespace vorn {
namespace network {
namespace ipv6 {
namespace router {

namespace {
const char kRecordPrefix[] = "ipv6-";
const int kListCapacity = 1024;
const int kMaxSplitLength = 63;
}  // namespace

Router6Prefix::Router6Prefix() {
  if (!Load()) VORN_LOG(LOG_WARNING, "Failed to load (some of) IPv6 router config");
}

bool Router6Prefix::Load() {
  _routers.clear();
  PVLIBSZLIST list = VLIBCSzListAlloc(kListCapacity);
  if (!list) return false;
  bool ok = true;
  if (VLIBCFileEnumDir(kRouter6ConfigDir, kRecordPrefix, &list, VLIBC_ENUM_DIR_FILE) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum dir (%s/%s)", kRouter6ConfigDir, kRecordPrefix);
    VLIBCSzListFree(list);
    return false;
  }
  for (int i = 0; i < VLIBCSzListCount(list); ++i) {
    const std::string path = std::string(kRouter6ConfigDir) + "/" + VLIBCSzListGet(list, i);
    char wan[1024] = "";
    if (VLIBCFileGetSectionValue(path.c_str(), "conf", "wan", wan, sizeof wan) <= 0) {
      VORN_LOG(LOG_WARNING, "Failed to get wan from %s", path.c_str());
      ok = false;
      continue;
    }
    Router6Attr attr;
    attr.wan = wan;
    if (attr.LoadConfig() < 0) ok = false;
    _routers.push_back(attr);
  }
  VLIBCSzListFree(list);
  return ok;
}

std::string Router6Prefix::NormalizePrefix(std::string const& text) {
  in6_addr addr;
  char out[INET6_ADDRSTRLEN] = "";
  if (inet_pton(AF_INET6, text.c_str(), &addr) != 1 ||
      inet_ntop(AF_INET6, &addr, out, sizeof out) == nullptr) {
    VORN_LOG(LOG_ERR, "Failed to convert %s into binary form", text.c_str());
    return "";
  }
  return out;
}

std::string Router6Prefix::AllocatedTo(std::string const& prefix, Router6Attr const& attr) {
  const std::string wanted = NormalizePrefix(prefix);
  for (Router6Attr::LanList::const_iterator it = attr.lans.begin(); it != attr.lans.end();
       ++it) {
    if (NormalizePrefix(it->first) == wanted) return it->second;
  }
  return "";
}

std::vector<std::string> Router6Prefix::EnumPrefix64(std::string const& prefix, int length) {
  std::vector<std::string> result;
  if (length > 64) {
    VORN_LOG(LOG_ERR, "Error: require larger prefix range for splitting (cur: %d, max: %d)",
             length, kMaxSplitLength);
    return result;
  }
  const std::string normalized = NormalizePrefix(prefix);
  if (normalized.empty()) return result;
  if (length == 64) {
    result.push_back(normalized);
    return result;
  }
  in6_addr addr;
  inet_pton(AF_INET6, normalized.c_str(), &addr);
  char out[INET6_ADDRSTRLEN];
  addr.s6_addr[7] &= static_cast<unsigned char>(~1u);
  inet_ntop(AF_INET6, &addr, out, sizeof out);
  result.push_back(out);
  addr.s6_addr[7] |= 1u;
  inet_ntop(AF_INET6, &addr, out, sizeof out);
  result.push_back(out);
  return result;
}

std::vector<std::string> Router6Prefix::Candidates(Router6Attr const& attr, bool logEmpty) {
  std::vector<std::string> none;
  if (attr.prefix.empty() && logEmpty) {
    VORN_LOG(LOG_ERR, "Empty prefix, skip");
    return none;
  }
  const std::string::size_type slash = attr.prefix.find('/');
  if (slash == std::string::npos) {
    VORN_LOG(LOG_ERR, "Unable to tokenize prefix %s, skip", attr.prefix.c_str());
    return none;
  }
  const int length = boost::lexical_cast<int>(attr.prefix.substr(slash + 1));
  std::vector<std::string> candidates = EnumPrefix64(attr.prefix.substr(0, slash), length);
  if (candidates.empty()) VORN_LOG(LOG_ERR, "Unable to enumerate available prefix");
  return candidates;
}

std::vector<Router6PrefixAttr> Router6Prefix::List() const {
  std::vector<Router6PrefixAttr> result;
  for (std::vector<Router6Attr>::const_iterator r = _routers.begin(); r != _routers.end(); ++r) {
    const std::vector<std::string> candidates = Candidates(*r, true);
    for (std::size_t i = 0; i < candidates.size(); ++i) {
      Router6PrefixAttr entry;
      entry.prefix = candidates[i];
      entry.wan = r->wan;
      entry.lan = AllocatedTo(candidates[i], *r);
      result.push_back(entry);
    }
  }
  return result;
}

bool Router6Prefix::Allocate(std::string const& prefix, std::string const& lan) {
  const std::string normalized = NormalizePrefix(prefix);
  if (!normalized.empty()) {
    for (std::vector<Router6Attr>::iterator r = _routers.begin(); r != _routers.end(); ++r) {
      const std::vector<std::string> candidates = Candidates(*r, false);
      for (std::size_t i = 0; i < candidates.size(); ++i) {
        if (candidates[i] == normalized && AllocatedTo(candidates[i], *r).empty()) {
          r->AddLan(normalized, lan);
          r->SaveConfig();
          return true;
        }
      }
    }
  }
  VORN_LOG(LOG_WARNING, "Unable to find matching prefix %s allocate for %s", prefix.c_str(),
           lan.c_str());
  return false;
}

bool Router6Prefix::Deallocate(std::string const& prefix, std::string const& lan) {
  const std::string normalized = NormalizePrefix(prefix);
  if (!normalized.empty()) {
    for (std::vector<Router6Attr>::iterator r = _routers.begin(); r != _routers.end(); ++r) {
      if (!lan.empty() && AllocatedTo(normalized, *r) == lan) {
        r->RemoveLan(normalized, lan);
        r->SaveConfig();
        return true;
      }
    }
  }
  VORN_LOG(LOG_INFO, "No matching prefix %s on %s to remove, possibly gone", prefix.c_str(),
           lan.c_str());
  return true;
}

}  // namespace router
}  // namespace ipv6
}  // namespace network
}  // namespace vorn

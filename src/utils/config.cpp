#include "vornwireless/utils/config.h"

#include <libgen.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <sstream>

#include "vornplatform/file.h"
#include "vornplatform/log.h"
#include "vornplatform/szhash.h"
#include "vornwireless/utils/file.h"

namespace vornwireless {
namespace utils {

namespace {

constexpr int kPathMax = 1024;  // buffers hold at most 1023 characters and the NUL
constexpr int kHashSize = 1024;

std::string IntToString(int value) {
  std::ostringstream out;
  out << value;
  return out.str();
}

std::string DoubleToString(double value) {
  std::ostringstream out;
  out << value;
  return out.str();
}

// Frees a platform hash or list on every path.
struct HashHolder {
  PVLIBSZHASH hash;
  ~HashHolder() { VLIBCSzHashFree(hash); }
};
struct ListHolder {
  PVLIBSZLIST list;
  ~ListHolder() { VLIBCSzListFree(list); }
};

}  // namespace

std::string Config::GetDirName() const {
  char buf[kPathMax];
  snprintf(buf, sizeof buf, "%s", _name.c_str());
  return dirname(buf);
}

// ---------------------------------------------------------------------------------------------
// ConfigNoSection

void ConfigNoSection::AddKeyValue(std::string const& key, std::string const& value) {
  _keys[key] = value;
}
void ConfigNoSection::AddKeyValue(std::string const& key, char const* value) {
  _keys[key] = value ? value : "";
}
void ConfigNoSection::AddKeyValue(std::string const& key, int value) {
  _keys[key] = IntToString(value);
}
void ConfigNoSection::AddKeyValue(std::string const& key, double value) {
  _keys[key] = DoubleToString(value);
}
void ConfigNoSection::AddKeyValue(std::string const& key, bool value) {
  _keys[key] = value ? "yes" : "no";
}

std::string ConfigNoSection::GetKeyValue(std::string const& key) { return _keys[key]; }

int ConfigNoSection::Write() {
  if (CheckAndMakeDir(GetDirName(), 0755) < 0) {
    VORN_LOG(LOG_ERR, "Failed to check and make [%s]", GetDirName().c_str());
    return -1;
  }
  unlink(_name.c_str());
  if (VLIBCFileTouch(_name.c_str()) < 0) {
    VORN_LOG(LOG_ERR, "Failed to touch [%s]", _name.c_str());
    return -1;
  }
  HashHolder keys{VLIBCSzHashAlloc(kHashSize)};
  HashHolder other{VLIBCSzHashAlloc(kHashSize)};
  if (!keys.hash || !other.hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  for (auto const& kv : _keys) {
    if (VLIBCSzHashSetValue(keys.hash, kv.first.c_str(), kv.second.c_str()) < 0) {
      VORN_LOG(LOG_ERR, "Failed to set hash value[%s][%s]", kv.first.c_str(), kv.second.c_str());
    }
  }
  if (VLIBCFileSetKeys(_name.c_str(), keys.hash, other.hash, 0) < 0) {
    VORN_LOG(LOG_ERR, "Failed to set keys");
    return -1;
  }
  return 0;
}

int ConfigNoSection::Read() {
  if (VLIBCFileExist(_name.c_str()) == 0) {
    VORN_LOG(LOG_ERR, "[%s] does not exist", _name.c_str());
    return -1;
  }
  HashHolder keys{VLIBCSzHashAlloc(kHashSize)};
  if (!keys.hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  if (VLIBCFileGetKeys(_name.c_str(), 0, &keys.hash, "=") < 0) {
    VORN_LOG(LOG_ERR, "Failed to get keys of [%s]", _name.c_str());
    return -1;
  }
  _keys.clear();
  if (!keys.hash) {
    VORN_LOG(LOG_ERR, "Null hash");
    return -1;
  }
  for (int i = 0; i < keys.hash->nSlot; ++i) {
    VLIBSZHASH_SLOT const& slot = keys.hash->pSlots[i];
    if (!slot.szKey) continue;
    _keys[slot.szKey] = slot.szValue ? slot.szValue : "";
  }
  return 0;
}

// ---------------------------------------------------------------------------------------------
// ConfigSection

void ConfigSection::AddKeyValue(std::string const& section, std::string const& key,
                                std::string const& value) {
  _sections[section][key] = value;
}
void ConfigSection::AddKeyValue(std::string const& section, std::string const& key,
                                char const* value) {
  _sections[section][key] = value ? value : "";
}
void ConfigSection::AddKeyValue(std::string const& section, std::string const& key, int value) {
  _sections[section][key] = IntToString(value);
}
void ConfigSection::AddKeyValue(std::string const& section, std::string const& key,
                                double value) {
  _sections[section][key] = DoubleToString(value);
}
void ConfigSection::AddKeyValue(std::string const& section, std::string const& key, bool value) {
  _sections[section][key] = value ? "yes" : "no";
}

std::string ConfigSection::GetKeyValue(std::string const& section, std::string const& key) {
  return _sections[section][key];
}

bool ConfigSection::Find(std::string const& section) const {
  return _sections.find(section) != _sections.end();
}

void ConfigSection::DeleteSection(std::string const& section) { _sections.erase(section); }

int ConfigSection::WriteTemp(std::string& tmpPath) {
  char tmpl[kPathMax];
  snprintf(tmpl, sizeof tmpl, "%s.tmp.XXXXXX", _name.c_str());

  mode_t old = umask(0177);
  int fd = mkstemp(tmpl);
  umask(old);
  if (fd < 0) {
    VORN_LOG(LOG_ERR, "Failed to create a temporary file [%s]", tmpl);
    return -1;
  }
  FILE* fp = fdopen(fd, "w");
  if (!fp) {
    VORN_LOG(LOG_ERR, "Failed to open a temporary file [%s]", tmpl);
    close(fd);
    if (unlink(tmpl) != 0) VORN_LOG(LOG_ERR, "Failed to remove file [%s]", tmpl);
    return -1;
  }

  bool ok = true;
  {
    HashHolder keys{VLIBCSzHashAlloc(kHashSize)};
    if (!keys.hash) {
      VORN_LOG(LOG_ERR, "Failed to allocate memory");
      ok = false;
    }
    for (auto it = _sections.begin(); ok && it != _sections.end(); ++it) {
      VLIBCHashRemoveAll(keys.hash);
      for (auto const& kv : it->second) {
        if (VLIBCSzHashSetValue(keys.hash, kv.first.c_str(), kv.second.c_str()) < 0) {
          VORN_LOG(LOG_ERR, "Failed to set hash value[%s][%s]", kv.first.c_str(),
                   kv.second.c_str());
        }
      }
      if (VLIBCFileHash2File(fp, it->first.c_str(), keys.hash, "\t%s=%s\n") != 0) {
        VORN_LOG(LOG_ERR, "Failed to add section [%s] in [%s]", it->first.c_str(), tmpl);
        ok = false;
      }
    }
  }

  // The data must be on the disk before the caller renames the file over the old one.
  if (fflush(fp) != 0 || fsync(fileno(fp)) != 0) {
    VORN_LOG(LOG_ERR, "Failed to flush a temporary file [%s][%d]", tmpl, errno);
    ok = false;
  }
  if (fclose(fp) != 0) {
    VORN_LOG(LOG_ERR, "Failed to close a temporary file [%s][%d]", tmpl, errno);
    ok = false;
  }
  if (!ok) {
    if (unlink(tmpl) != 0) VORN_LOG(LOG_ERR, "Failed to remove file [%s]", tmpl);
    return -1;
  }
  tmpPath = tmpl;
  return 0;
}

int ConfigSection::Write() {
  if (CheckAndMakeDir(GetDirName(), 0755) < 0) {
    VORN_LOG(LOG_ERR, "Failed to check and make [%s]", GetDirName().c_str());
    return -1;
  }
  std::string tmp;
  int result = 0;
  if (WriteTemp(tmp) < 0) {
    VORN_LOG(LOG_ERR, "Failed to create a temoprary file for [%s]", _name.c_str());
    result = -1;
  } else if (rename(tmp.c_str(), _name.c_str()) != 0) {
    VORN_LOG(LOG_ERR, "Failed to rename file from [%s] to [%s]", tmp.c_str(), _name.c_str());
    result = -1;
  }
  if (!tmp.empty() && access(tmp.c_str(), F_OK) == 0 && unlink(tmp.c_str()) != 0) {
    VORN_LOG(LOG_ERR, "Failed to remove file [%s]", tmp.c_str());
  }
  return result;
}

int ConfigSection::Read() {
  if (VLIBCFileExist(_name.c_str()) == 0) {
    VORN_LOG(LOG_ERR, "[%s] does not exist", _name.c_str());
    return -1;
  }
  ListHolder names{VLIBCSzListAlloc(kHashSize)};
  HashHolder keys{VLIBCSzHashAlloc(kHashSize)};
  if (!names.list || !keys.hash) {
    VORN_LOG(LOG_ERR, "Failed to allocate memory");
    return -1;
  }
  if (VLIBCFileEnumSection(_name.c_str(), &names.list) < 0) {
    VORN_LOG(LOG_ERR, "Failed to enum sections in [%s]", _name.c_str());
    return -1;
  }
  for (int i = 0; i < names.list->nItem; ++i) {
    char const* section = names.list->pszItem[i];
    if (!section) continue;
    if (VLIBCFileGetSection(_name.c_str(), section, &keys.hash) < 1) {
      VORN_LOG(LOG_ERR, "Failed to get section [%s] in [%s]", section, _name.c_str());
      return -1;
    }
    std::map<std::string, std::string>& target = _sections[section];
    target.clear();
    for (int s = 0; s < keys.hash->nSlot; ++s) {
      VLIBSZHASH_SLOT const& slot = keys.hash->pSlots[s];
      if (!slot.szKey) continue;
      target[slot.szKey] = slot.szValue ? slot.szValue : "";
    }
    VLIBCHashRemoveAll(keys.hash);
  }
  return 0;
}

}  // namespace utils
}  // namespace vornwireless

// Flat and sectioned key files as sorted maps in memory; a file is always written out whole,
// keys in sorted order.
#ifndef VORNWIRELESS_UTILS_CONFIG_H
#define VORNWIRELESS_UTILS_CONFIG_H

#include <map>
#include <string>

namespace vornwireless {
namespace utils {

class Config {
 public:
  Config() = default;
  explicit Config(std::string const& name) : _name(name) {}
  virtual ~Config() = default;
  virtual int Write() = 0;  // 0 or -1
  virtual int Read() = 0;   // 0 or -1

  void SetName(std::string const& name) { _name = name; }
  std::string GetNameString() const { return _name; }
  char const* GetNameCString() const { return _name.c_str(); }
  // dirname() of the first 1023 characters of the path.
  std::string GetDirName() const;

 protected:
  std::string _name;
};

// key=value lines, read with separator "=". Write is not atomic: the file is removed, touched and
// filled again (readers of these files tolerate that).
class ConfigNoSection : public Config {
 public:
  ConfigNoSection() = default;
  explicit ConfigNoSection(std::string const& path) : Config(path) {}

  int Write() override;
  int Read() override;

  void AddKeyValue(std::string const& key, std::string const& value);
  void AddKeyValue(std::string const& key, char const* value);
  void AddKeyValue(std::string const& key, int value);
  void AddKeyValue(std::string const& key, double value);
  void AddKeyValue(std::string const& key, bool value);  // "yes" / "no"
  // Like map operator[]: an unknown key is created with an empty value.
  std::string GetKeyValue(std::string const& key);
  std::map<std::string, std::string> GetKeyValues() const { return _keys; }

 private:
  std::map<std::string, std::string> _keys;
};

// "[section]" headers, each followed by "\tkey=value" lines. Write is atomic: a reader never sees
// a half-written file.
class ConfigSection : public Config {
 public:
  using Sections = std::map<std::string, std::map<std::string, std::string>>;

  ConfigSection() = default;
  explicit ConfigSection(std::string const& path) : Config(path) {}

  int Write() override;
  int Read() override;
  // Writes every section to a new temporary file beside the target (mode 0600); its name goes to
  // tmpPath on success. 0 or -1.
  int WriteTemp(std::string& tmpPath);

  void AddKeyValue(std::string const& section, std::string const& key, std::string const& value);
  void AddKeyValue(std::string const& section, std::string const& key, char const* value);
  void AddKeyValue(std::string const& section, std::string const& key, int value);
  void AddKeyValue(std::string const& section, std::string const& key, double value);
  void AddKeyValue(std::string const& section, std::string const& key, bool value);
  std::string GetKeyValue(std::string const& section, std::string const& key);
  Sections GetKeyValues() const { return _sections; }
  bool Find(std::string const& section) const;
  void DeleteSection(std::string const& section);
  bool Empty() const { return _sections.empty(); }

 private:
  Sections _sections;
};

}  // namespace utils
}  // namespace vornwireless

#endif
